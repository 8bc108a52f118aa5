// Shows every widget and layout of the themes in typical and in hard cases and saves a picture of each, light and dark.
//
//   gallery OUTDIR [WIDTH HEIGHT [TEXT_PERCENT [SCENE...]]]
//
// Without the name of a scene it shows all of them. ELM_SCALE sets the density. It needs no display. It fails when a
// theme lacks what a scene asks for.
#include "assist/assist.h"
#include "scenes.h"
#include "theme/theme.h"
#include <Ecore_Evas.h>
#include <Efreet.h>
#include <Elementary.h>
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>

namespace fs = std::filesystem;

namespace {

void run_for(double seconds)
{
    ecore_timer_add(
        seconds,
        [](void *) {
            ecore_main_loop_quit();
            return ECORE_CALLBACK_CANCEL;
        },
        nullptr);
    ecore_main_loop_begin();
}

bool save(Evas_Object *win, const fs::path &file)
{
    Ecore_Evas *canvas = ecore_evas_ecore_evas_get(evas_object_evas_get(win));
    ecore_evas_manual_render(canvas);
    int w = 0, h = 0;
    ecore_evas_geometry_get(canvas, nullptr, nullptr, &w, &h);
    const void *pixels = ecore_evas_buffer_pixels_get(canvas);
    if (!pixels)
        return false;
    Ecore_Evas *writer = ecore_evas_buffer_new(1, 1);
    Evas_Object *image = evas_object_image_add(ecore_evas_get(writer));
    evas_object_image_size_set(image, w, h);
    evas_object_image_data_copy_set(image, const_cast<void *>(pixels));
    const bool saved = evas_object_image_save(image, file.c_str(), nullptr, nullptr);
    ecore_evas_free(writer);
    return saved;
}

} // namespace

int main(int argc, char **argv)
{
    if (argc < 2) {
        fprintf(stderr, "usage: gallery OUTDIR [WIDTH HEIGHT [TEXT_PERCENT [SCENE...]]]\n");
        return 2;
    }
    const fs::path out = argv[1];
    const int width = argc > 3 ? atoi(argv[2]) : 480, height = argc > 3 ? atoi(argv[3]) : 800;
    setenv("ORVANT_TEXT_PERCENT", argc > 4 ? argv[4] : "100", 1);
    fs::create_directories(out);

    setenv("ELM_ENGINE", "buffer", 1);
    setenv("ELM_PROFILE", "mobile", 0);
    setenv("ELM_SCALE", "1.8", 0);
    setenv("EINA_LOG_LEVELS", "eldbus:0,eina_safety:0,ecore_system_upower:0,ecore_system_systemd:0", 0);
    setenv("EINA_LOG_BACKTRACE", "-1", 0);
    efreet_cache_disable();
    elm_init(argc, argv);
    elm_app_base_scale_set(1.8);

    const fs::path root = fs::read_symlink("/proc/self/exe").parent_path().parent_path().parent_path();
    elm_theme_overlay_add(nullptr, (root / "platform/theme/platform.edj").c_str());
    elm_theme_extension_add(nullptr, (root / "res/edje/velora_genlist.edj").c_str());
    gallery_resources = root / "res/edje";

    const fs::path tables = root / "shared/res/tables";
    ea_theme_color_table_h colors =
        ea_theme_color_table_new((tables / "com.orvant.velora_ChangeableColorInfo.xml").c_str());
    ea_theme_font_table_h fonts =
        ea_theme_font_table_new((tables / "com.orvant.velora_ChangeableColorFontInfo.xml").c_str());
    if (!colors || !fonts)
        return 1;
    ea_theme_changeable_ui_enabled_set(true);
    ea_theme_fonts_set(fonts);

    int failed = 0;
    for (const bool dark : {false, true}) {
        setenv("ORVANT_THEME", dark ? "dark" : "light", 1);
        ea_theme_colors_set(colors, 0);
        for (const Scene &scene : gallery_scenes()) {
            if (argc > 5 && std::none_of(argv + 5, argv + argc,
                                         [&scene](const char *name) { return std::strcmp(scene.name, name) == 0; }))
                continue;
            Evas_Object *win = elm_win_add(nullptr, "gallery", ELM_WIN_BASIC);
            evas_object_resize(win, width, height);
            evas_object_show(win);
            platform_theme_window_watch(win);
            scene.build(win);
            run_for(1.0);
            const fs::path file = out / (std::string(scene.name) + (dark ? "-dark.png" : ".png"));
            if (!save(win, file)) {
                fprintf(stderr, "cannot save %s\n", file.c_str());
                ++failed;
            }
            evas_object_del(win);
            run_for(0.01);
        }
    }
    ea_theme_color_table_free(colors);
    ea_theme_font_table_free(fonts);
    elm_shutdown();
    return failed || gallery_missing ? 1 : 0;
}
