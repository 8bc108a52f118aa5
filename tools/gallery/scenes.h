#pragma once
// The scenes of the gallery.
#include <Evas.h>
#include <filesystem>
#include <vector>

struct Scene {
    const char *name;                // of the picture
    void (*build)(Evas_Object *win); // fills the window; main loop
};

// Folder of the application's theme files; set before the first scene is built.
extern std::filesystem::path gallery_resources;

// How many styles, groups and pictures the scenes asked for in vain.
extern int gallery_missing;

const std::vector<Scene> &gallery_scenes();
