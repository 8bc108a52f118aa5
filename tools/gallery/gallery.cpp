// Shows every widget and layout of the themes in typical and in hard cases and saves a picture of each, light and dark.
//
//   gallery OUTDIR [WIDTH HEIGHT [TEXT_PERCENT]]
//
// ELM_SCALE sets the density. It needs no display. It fails when a theme lacks what a scene asks for.
#include "scenes.h"
#include "theme/theme.h"
#include <Ecore_Evas.h>
#include <Elementary.h>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <glib.h>
#include <string>
#include <vector>

namespace fs = std::filesystem;

namespace {

// One table of changeable colours or fonts, applied while it is read.
struct TableReader {
    bool dark;
    int text_percent;
};

const char *attribute(const char **names, const char **values, const char *name)
{
    for (; *names; ++names, ++values)
        if (std::string_view(*names) == name)
            return *values;
    return "";
}

void element(GMarkupParseContext *, const char *tag, const char **names, const char **values, gpointer data, GError **)
{
    const auto *reader = static_cast<TableReader *>(data);
    const char *name = attribute(names, values, "class");
    if (std::string_view(tag) == "color") {
        unsigned r = 0, g = 0, b = 0, a = 0;
        if (sscanf(attribute(names, values, reader->dark ? "dark" : "light"), "#%2x%2x%2x%2x", &r, &g, &b, &a) == 4)
            edje_color_class_set(name, int(r), int(g), int(b), int(a), 0, 0, 0, 0, 0, 0, 0, 0);
    } else if (std::string_view(tag) == "font")
        edje_text_class_set(name, attribute(names, values, "font"),
                            atoi(attribute(names, values, "size")) * reader->text_percent / 100);
}

void apply_table(const fs::path &file, TableReader reader)
{
    gchar *text = nullptr;
    gsize length = 0;
    if (!g_file_get_contents(file.c_str(), &text, &length, nullptr)) {
        fprintf(stderr, "cannot read %s\n", file.c_str());
        exit(1);
    }
    static constexpr GMarkupParser parser = {element, nullptr, nullptr, nullptr, nullptr};
    GMarkupParseContext *context = g_markup_parse_context_new(&parser, GMarkupParseFlags(0), &reader, nullptr);
    GError *error = nullptr;
    if (!g_markup_parse_context_parse(context, text, gssize(length), &error)) {
        fprintf(stderr, "%s: %s\n", file.c_str(), error->message);
        exit(1);
    }
    g_markup_parse_context_free(context);
    g_free(text);
}

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
        fprintf(stderr, "usage: gallery OUTDIR [WIDTH HEIGHT [TEXT_PERCENT]]\n");
        return 2;
    }
    const fs::path out = argv[1];
    const int width = argc > 3 ? atoi(argv[2]) : 480, height = argc > 3 ? atoi(argv[3]) : 800;
    const int text_percent = argc > 4 ? atoi(argv[4]) : 100;
    fs::create_directories(out);

    setenv("ELM_ENGINE", "buffer", 1);
    setenv("ELM_PROFILE", "mobile", 0);
    setenv("ELM_SCALE", "1.8", 0);
    elm_init(argc, argv);
    elm_app_base_scale_set(1.8);

    const fs::path root = fs::read_symlink("/proc/self/exe").parent_path().parent_path().parent_path();
    elm_theme_overlay_add(nullptr, (root / "platform/theme/platform.edj").c_str());
    elm_theme_extension_add(nullptr, (root / "res/edje/velora_genlist.edj").c_str());
    gallery_resources = root / "res/edje";

    int failed = 0;
    for (const bool dark : {false, true}) {
        const fs::path tables = root / "shared/res/tables";
        apply_table(tables / "com.orvant.velora_ChangeableColorInfo.xml", {dark, text_percent});
        apply_table(tables / "com.orvant.velora_ChangeableColorFontInfo.xml", {dark, text_percent});
        for (const Scene &scene : gallery_scenes()) {
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
    elm_shutdown();
    return failed || gallery_missing ? 1 : 0;
}
