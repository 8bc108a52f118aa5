#include "velora_common/velora_setup_row.h"
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_paths.h"
#include <algorithm>
#include <clocale>
#include <cstring>
#include <libintl.h>

static constexpr int s_drawn_width = 480;
static constexpr double s_drawn_scale = 1.8;
static constexpr int s_drawn_text = 28; // without a table of fonts

static const char *__text(const char *id)
{
    return dcgettext(VELORA_DOMAIN, id, LC_MESSAGES);
}

SetupItemData *__setup_create_genlist_item_data(int index, void *view, const char *text_id_1, const char *text_id_2,
                                                const char *kind, int position)
{
    return new SetupItemData{index, view, g_strdup(text_id_1), g_strdup(text_id_2), g_strdup(kind), position};
}

void __gl_del(void *data, Evas_Object *)
{
    auto *item_data = static_cast<SetupItemData *>(data);
    if (!item_data) {
        VELORA_LOGE("data is NULL");
        return;
    }
    for (char *text : {item_data->text_id_1, item_data->text_id_2, item_data->kind})
        g_free(text);
    delete item_data;
}

char *__gl_text_get(void *data, Evas_Object *, const char *part)
{
    const auto *item_data = static_cast<SetupItemData *>(data);
    if (!item_data) {
        VELORA_LOGE("item_data is NULL");
        return nullptr;
    }
    const char *id = nullptr;
    if (std::strcmp(part, "elm.text.main") == 0)
        id = item_data->text_id_1;
    else if (std::strcmp(part, "elm.text.main.left") == 0 || std::strcmp(part, "elm.text.multiline") == 0)
        id = item_data->text_id_2;
    return id ? strdup(__text(id)) : nullptr;
}

void __setup_realized_legal_privacy_cb(void *, Evas_Object *, void *event_info)
{
    auto *item = static_cast<Elm_Object_Item *>(event_info);
    if (!item) {
        VELORA_LOGE("Invalid argument: ei is NULL");
        return;
    }
    const auto *item_data = static_cast<SetupItemData *>(elm_object_item_data_get(item));
    static const char *const signals[] = {"elm,state,top", "elm,state,center", "elm,state,bottom"};
    if (!item_data || item_data->position < 0 || item_data->position > 2)
        return;
    elm_object_item_signal_emit(item, signals[item_data->position], "");
    if (item_data->position == 1) // the two options are a card of their own
        elm_object_item_signal_emit(item, item_data->index == 0 ? "platform,row,first" : "platform,row,last",
                                    "platform");
}

Elm_Genlist_Item_Class *_velora_setup_item_class_create(const char *style, Elm_Gen_Item_Content_Get_Cb content_get)
{
    Elm_Genlist_Item_Class *item_class = elm_genlist_item_class_new();
    item_class->item_style = style;
    item_class->func.text_get = __gl_text_get;
    item_class->func.content_get = content_get;
    item_class->func.state_get = nullptr;
    item_class->func.del = __gl_del;
    return item_class;
}

static void __language_changed_cb(void *, Evas_Object *genlist, void *)
{
    elm_genlist_realized_items_update(genlist);
}

static const char s_fitted[] = "fitted", s_fit_job[] = "fit job";

static void __fit_job(void *data)
{
    auto *genlist = static_cast<Evas_Object *>(data);
    evas_object_data_del(genlist, s_fit_job);
    elm_genlist_realized_items_update(genlist);
}

// Rows are measured with their content, which is as wide as the list was.
static void __resized_cb(void *, Evas *, Evas_Object *genlist, void *)
{
    int width = 0, height = 0;
    evas_object_geometry_get(genlist, nullptr, nullptr, &width, &height);
    void *now = GINT_TO_POINTER(width << 16 | height);
    if (evas_object_data_get(genlist, s_fitted) == now || evas_object_data_get(genlist, s_fit_job))
        return;
    evas_object_data_set(genlist, s_fitted, now);
    evas_object_data_set(genlist, s_fit_job, ecore_job_add(__fit_job, genlist));
}

static void __deleted_cb(void *, Evas *, Evas_Object *genlist, void *)
{
    if (auto *job = static_cast<Ecore_Job *>(evas_object_data_del(genlist, s_fit_job)))
        ecore_job_del(job);
}

Evas_Object *_velora_setup_list_create(Evas_Object *parent)
{
    Evas_Object *genlist = elm_genlist_add(parent);
    elm_genlist_mode_set(genlist, ELM_LIST_COMPRESS);
    evas_object_smart_callback_add(genlist, "language,changed", __language_changed_cb, nullptr);
    evas_object_smart_callback_add(genlist, "realized", __setup_realized_legal_privacy_cb, nullptr);
    evas_object_event_callback_add(genlist, EVAS_CALLBACK_RESIZE, __resized_cb, nullptr);
    evas_object_event_callback_add(genlist, EVAS_CALLBACK_DEL, __deleted_cb, nullptr);
    return genlist;
}

Elm_Object_Item *_velora_setup_page_push(Evas_Object *naviframe, Evas_Object *list, const char *button_id,
                                         Evas_Smart_Cb button_cb, Elm_Naviframe_Item_Pop_Cb back_cb, void *data)
{
    static const char title_id[] = "IDS_STU_HEADER_UPLOAD_CONTENT_TO_VELORA_ABB";
    Elm_Object_Item *item =
        elm_naviframe_item_push(naviframe, __text(title_id), nullptr, nullptr, list, nullptr);
    elm_object_item_domain_translatable_part_text_set(item, "default", VELORA_DOMAIN, title_id);
    elm_naviframe_item_pop_cb_set(item, back_cb, data);
    ea_screen_reader_name_set(elm_object_parent_widget_get(list), __text(title_id));
    Evas_Object *button = elm_button_add(naviframe);
    elm_object_style_set(button, "bottom");
    elm_object_domain_translatable_text_set(button, VELORA_DOMAIN, button_id);
    evas_object_smart_callback_add(button, "clicked", button_cb, data);
    elm_object_item_part_content_set(item, "toolbar", button);
    elm_object_focus_set(list, EINA_TRUE);
    return item;
}

static Evas_Object *__title_create(Evas_Object *layout, const char *text_id)
{
    char *font = nullptr;
    int size = 0;
    if (!ea_theme_font_get("ATO007", &font, &size))
        size = s_drawn_text;
    std::free(font);
    Evas_Object *label = elm_label_add(layout);
    elm_label_line_wrap_set(label, ELM_WRAP_MIXED);
    char *text = g_strdup_printf("<align=center><font_size=%d>%s</font_size></align>", size, __text(text_id));
    elm_object_text_set(label, text);
    g_free(text);
    evas_object_size_hint_weight_set(label, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(label, EVAS_HINT_FILL, EVAS_HINT_FILL);
    return label;
}

// What the words and a small picture need at least, at this width.
static int __least_height(Evas_Object *label, int width)
{
    const double scale = elm_config_scale_get() / s_drawn_scale;
    constexpr int margins = 32, picture = 104; // as the groups have them
    int height = 0;
    edje_object_size_min_restricted_calc(elm_layout_edje_get(label), nullptr, &height,
                                         width - static_cast<int>(margins * scale), 0);
    return height + static_cast<int>((margins + picture) * scale);
}

Evas_Object *_velora_setup_illustration_create(Evas_Object *list, const char *group, int height, const char *text_id)
{
    Evas_Object *layout = elm_layout_add(list);
    if (!elm_layout_file_set(layout, _velora_common_app_file("res/edje/velora_setup_wizard.edj").c_str(), group)) {
        evas_object_del(layout);
        return nullptr;
    }
    Evas_Object *label = __title_create(layout, text_id);
    int width = 0, room = 0;
    evas_object_geometry_get(list, nullptr, nullptr, &width, &room);
    int wanted = height * width / s_drawn_width;
    if (room > 0) // where the page is wider than high it leaves room for what follows
        wanted = std::min(wanted, width > room ? room * 3 / 5 : room);
    wanted = std::max(wanted, __least_height(label, width));
    evas_object_size_hint_min_set(layout, width, wanted);
    evas_object_size_hint_max_set(layout, width, wanted);
    evas_object_resize(layout, width, wanted);
    elm_object_part_content_set(layout, "elm.title", label);
    return layout;
}
