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
static constexpr int s_narrowest = 320, s_plain_text = 26; // where letters keep that size

static double __scale()
{
    return elm_config_scale_get() / s_drawn_scale;
}

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

// Up and Down go from one row that can be chosen to the next; the toolkit takes them to titles too, which cannot show
// it. What no key stops at comes into sight with the row beside it.
static Eina_Bool __list_key_cb(void *data, Evas_Object *genlist, Evas_Object *, Evas_Callback_Type type,
                               void *event_info)
{
    if (type != EVAS_CALLBACK_KEY_DOWN)
        return EINA_FALSE;
    auto *event = static_cast<Evas_Event_Key_Down *>(event_info);
    const bool is_down = g_strcmp0(event->key, "Down") == 0 || g_strcmp0(event->key, "KP_Down") == 0;
    const bool is_up = g_strcmp0(event->key, "Up") == 0 || g_strcmp0(event->key, "KP_Up") == 0;
    if (!is_down && !is_up)
        return EINA_FALSE;
    const auto step = is_down ? elm_genlist_item_next_get : elm_genlist_item_prev_get;
    Elm_Object_Item *item = elm_object_focused_item_get(genlist);
    item = item ? step(item) : elm_genlist_first_item_get(genlist);
    while (item && elm_genlist_item_select_mode_get(item) != ELM_OBJECT_SELECT_MODE_DEFAULT)
        item = step(item);
    if (item) {
        elm_genlist_item_show(item, ELM_GENLIST_ITEM_SCROLLTO_IN);
        elm_object_item_focus_set(item, EINA_TRUE);
    } else {
        elm_genlist_item_show(is_down ? elm_genlist_last_item_get(genlist) : elm_genlist_first_item_get(genlist),
                              ELM_GENLIST_ITEM_SCROLLTO_IN);
        if (is_down)
            elm_object_focus_set(static_cast<Evas_Object *>(data), EINA_TRUE);
    }
    event->event_flags = static_cast<Evas_Event_Flags>(event->event_flags | EVAS_EVENT_FLAG_ON_HOLD);
    return EINA_TRUE;
}

Elm_Object_Item *_velora_setup_page_push(Evas_Object *naviframe, Evas_Object *list, const char *button_id,
                                         Evas_Smart_Cb button_cb, Elm_Naviframe_Item_Pop_Cb back_cb, void *data)
{
    static const char title_id[] = "IDS_STU_HEADER_UPLOAD_CONTENT_TO_VELORA_ABB";
    Elm_Object_Item *item = elm_naviframe_item_push(naviframe, __text(title_id), nullptr, nullptr, list, nullptr);
    elm_object_item_domain_translatable_part_text_set(item, "default", VELORA_DOMAIN, title_id);
    elm_naviframe_item_pop_cb_set(item, back_cb, data);
    ea_screen_reader_name_set(elm_object_parent_widget_get(list), __text(title_id));
    Evas_Object *button = elm_button_add(naviframe);
    elm_object_style_set(button, "bottom");
    elm_object_domain_translatable_text_set(button, VELORA_DOMAIN, button_id);
    evas_object_smart_callback_add(button, "clicked", button_cb, data);
    elm_object_item_part_content_set(item, "toolbar", button);
    elm_object_event_callback_add(list, __list_key_cb, button);
    elm_object_focus_set(elm_genlist_items_count(list) > 1 ? list : button, EINA_TRUE);
    return item;
}

int _velora_setup_font_size(Evas_Object *widget, const char *font_class)
{
    char *font = nullptr;
    int size = s_plain_text, width = 0, height = 0;
    if (!ea_theme_font_get(font_class, &font, &size) || size <= 0)
        size = s_plain_text;
    std::free(font);
    evas_output_size_get(evas_object_evas_get(widget), &width, &height);
    const int shorter = static_cast<int>(std::min(width, height) / __scale());
    if (shorter >= s_drawn_width)
        return size;
    const int more = s_plain_text * std::max(shorter - s_narrowest, 0) / (s_drawn_width - s_narrowest);
    return std::min(size, s_plain_text + more);
}

static Evas_Object *__title_create(Evas_Object *layout, const char *text_id)
{
    const int size = _velora_setup_font_size(layout, "ATO007");
    Evas_Object *label = elm_label_add(layout);
    elm_label_line_wrap_set(label, ELM_WRAP_MIXED);
    char *text = g_strdup_printf("<align=center><font_size=%d>%s</font_size></align>", size, __text(text_id));
    elm_object_text_set(label, text);
    g_free(text);
    evas_object_size_hint_weight_set(label, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(label, EVAS_HINT_FILL, EVAS_HINT_FILL);
    return label;
}

int _velora_setup_label_height(Evas_Object *label, int width)
{
    int height = 0;
    edje_object_size_min_restricted_calc(elm_layout_edje_get(label), nullptr, &height, width, 0);
    return height;
}

// What the words and a small picture need at least, at this width.
static int __least_height(Evas_Object *label, int width)
{
    constexpr int margins = 32, picture = 104; // as the groups have them
    return _velora_setup_label_height(label, width - static_cast<int>(margins * __scale())) +
           static_cast<int>((margins + picture) * __scale());
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
    if (room > 0) // what follows is to be seen too where the page is wider than high
        wanted = std::min(wanted, width > room && elm_genlist_items_count(list) > 1 ? room * 3 / 5 : room);
    wanted = std::max(wanted, __least_height(label, width));
    evas_object_size_hint_min_set(layout, width, wanted);
    evas_object_size_hint_max_set(layout, width, wanted);
    evas_object_resize(layout, width, wanted);
    elm_object_part_content_set(layout, "elm.title", label);
    return layout;
}
