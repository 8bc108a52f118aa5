#include "pieces.h"
#include "scenes.h"
#include <Elementary.h>

std::filesystem::path gallery_resources;
int gallery_missing = 0;

void missing(const char *kind, const char *name)
{
    fprintf(stderr, "missing: %s%s\n", kind, name);
    ++gallery_missing;
}

std::string resource(const char *name)
{
    return (gallery_resources / name).string();
}

void expand(Evas_Object *obj)
{
    evas_object_size_hint_weight_set(obj, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(obj, EVAS_HINT_FILL, EVAS_HINT_FILL);
    evas_object_show(obj);
}

Evas_Object *layout_add(Evas_Object *parent, const char *group)
{
    Evas_Object *layout = elm_layout_add(parent);
    if (!elm_layout_file_set(layout, resource("velora.edj").c_str(), group))
        missing("group ", group);
    expand(layout);
    return layout;
}

Evas_Object *theme_layout_add(Evas_Object *parent, const char *group)
{
    Evas_Object *layout = elm_layout_add(parent);
    if (!elm_layout_theme_set(layout, "layout", group, "default"))
        missing("layout ", group);
    evas_object_show(layout);
    return layout;
}

Evas_Object *picture_add(Evas_Object *parent, const std::string &group)
{
    Evas_Object *image = elm_image_add(parent);
    if (!elm_image_file_set(image, resource("velora_edc_images.edj").c_str(), group.c_str()))
        missing("picture ", group.c_str());
    expand(image);
    return image;
}

Evas_Object *button_add(Evas_Object *parent, const char *style, const char *text)
{
    Evas_Object *button = elm_button_add(parent);
    if (style && !elm_object_style_set(button, style))
        missing("button style ", style);
    elm_object_text_set(button, text);
    evas_object_show(button);
    return button;
}

Evas_Object *progress_add(Evas_Object *parent, const char *style, double value)
{
    Evas_Object *bar = elm_progressbar_add(parent);
    elm_progressbar_horizontal_set(bar, EINA_TRUE);
    if (!elm_object_style_set(bar, style))
        missing("progress bar style ", style);
    elm_progressbar_value_set(bar, value);
    elm_progressbar_pulse(bar, EINA_TRUE);
    expand(bar);
    return bar;
}

// Window, conformant and naviframe as an application has them.
Evas_Object *frame_add(Evas_Object *win)
{
    Evas_Object *bg = elm_bg_add(win);
    expand(bg);
    elm_win_resize_object_add(win, bg);
    Evas_Object *conformant = elm_conformant_add(win);
    expand(conformant);
    elm_win_resize_object_add(win, conformant);
    Evas_Object *indicator = elm_bg_add(conformant);
    elm_object_style_set(indicator, "indicator/headerbg");
    elm_object_part_content_set(conformant, "elm.swallow.indicator_bg", indicator);
    Evas_Object *layout = elm_layout_add(conformant);
    elm_layout_theme_set(layout, "layout", "application", "default");
    expand(layout);
    elm_object_part_content_set(layout, "elm.swallow.bg", bg);
    elm_object_content_set(conformant, layout);
    Evas_Object *frame = elm_naviframe_add(layout);
    elm_naviframe_prev_btn_auto_pushed_set(frame, EINA_FALSE);
    elm_object_part_content_set(layout, "elm.swallow.content", frame);
    evas_object_show(frame);
    return frame;
}

Elm_Object_Item *page_add(Evas_Object *frame, const char *title, Evas_Object *content)
{
    return elm_naviframe_item_push(frame, title, button_add(frame, "naviframe/end_btn/default", ""), nullptr, content,
                                   nullptr);
}
