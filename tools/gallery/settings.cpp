#include "settings.h"
#include "pieces.h"
#include <Elementary.h>
#include <cstring>
#include <string_view>

namespace {

enum class End { none, toggle, radio };

struct Row {
    const char *style, *text, *sub = nullptr;
    const char *position = nullptr; // the signal that tells it where in its card it is
    End end = End::none;
    bool is_on = false, is_disabled = false;
    double used = -1; // of what the row's bar shows
};

constexpr const char *top = "elm,state,top", *center = "elm,state,center", *bottom = "elm,state,bottom";

constexpr Row settings_rows[] = {
    {"2line.top.3", "Speichernutzung", "14,21 GB / 15,00 GB", nullptr, End::none, false, false, 0.947},
    {"groupindex", "Von Orvant synchronisiert"},
    {"2line.top", "Synchronisierungszeitplan", "Alle 6 Stunden"},
    {"groupindex", "Kamera"},
    {"1line", "Kamera-Upload", nullptr, top, End::toggle, true},
    {"1line", "Nur über WLAN hochladen", nullptr, bottom, End::toggle, true},
    {"groupindex", "Bilder"},
    {"1line", "Bilder synchronisieren", nullptr, top, End::toggle, false},
    {"1line", "Bilder nur über WLAN-Verbindungen synchronisieren", nullptr, bottom, End::toggle, true, true},
    {"groupindex", "Videos"},
    {"1line", "Videos synchronisieren", nullptr, top, End::toggle, false},
    {"1line", "Videos nur über WLAN synchronisieren", nullptr, center, End::toggle, false, true},
    {"1line", "Donaudampfschifffahrtsgesellschaftskapitänsmütze", nullptr, bottom},
    {"2line.top.3", "Speichernutzung", "Wird geladen..."},
};

constexpr Row schedule_rows[] = {
    {"1line", "Jede Stunde", nullptr, nullptr, End::radio},
    {"1line", "Alle 3 Stunden", nullptr, nullptr, End::radio},
    {"1line", "Alle 6 Stunden", nullptr, nullptr, End::radio, true},
    {"1line", "Alle 12 Stunden", nullptr, nullptr, End::radio},
    {"1line", "Jeden Tag", nullptr, nullptr, End::radio},
};

constexpr Row first_rows[] = {
    {"1icon", nullptr, "picture", top},
    {"groupindex", "Hochladen über"},
    {"1line", "WLAN oder Mobilfunknetze", nullptr, top, End::radio, true},
    {"1line", "Nur WLAN", nullptr, bottom, End::radio},
    {"1icon", "Kamera-Upload zu Velora aktivieren"},
    {"multiline_sub", "Um 50 GB Speicherplatz zu erhalten, schließen Sie die Anleitung „Erste Schritte“ ab."},
};

char *text_get(void *data, Evas_Object *, const char *part_name)
{
    const auto *row = static_cast<const Row *>(data);
    const std::string_view part = part_name;
    const char *text = part.starts_with("elm.text.sub") ? row->sub : row->text;
    return text ? elm_entry_utf8_to_markup(text) : nullptr;
}

Evas_Object *radio_add(Evas_Object *list, bool is_on)
{
    auto *group = static_cast<Evas_Object *>(evas_object_data_get(list, "radio"));
    if (!group) {
        group = elm_radio_add(list);
        evas_object_data_set(list, "radio", group);
    }
    Evas_Object *radio = elm_radio_add(list);
    static int value = 0;
    elm_radio_state_value_set(radio, ++value);
    elm_radio_group_add(radio, group);
    if (is_on)
        elm_radio_value_set(group, value);
    return radio;
}

Evas_Object *toggle_add(Evas_Object *parent, bool is_on)
{
    Evas_Object *toggle = elm_check_add(parent);
    if (!elm_object_style_set(toggle, "on&off"))
        missing("check style ", "on&off");
    elm_check_state_set(toggle, is_on);
    return toggle;
}

Evas_Object *content_get(void *data, Evas_Object *list, const char *part_name)
{
    const auto *row = static_cast<const Row *>(data);
    const std::string_view part = part_name;
    if (part == "elm.icon" && std::strcmp(row->style, "1icon") == 0) {
        if (row->text)
            return button_add(list, "contacts", row->text);
        int width = 0;
        evas_object_geometry_get(list, nullptr, nullptr, &width, nullptr);
        Evas_Object *picture = evas_object_rectangle_add(evas_object_evas_get(list));
        evas_object_color_set(picture, 0, 60, 60, 100);
        evas_object_size_hint_min_set(picture, width, ELM_SCALE_SIZE(200));
        return picture;
    }
    if (part == "elm.icon.2" && row->end != End::none) {
        Evas_Object *holder = theme_layout_add(list, "list/C/type.2");
        elm_object_part_content_set(holder, "elm.swallow.content",
                                    row->end == End::radio ? radio_add(list, row->is_on)
                                                           : toggle_add(list, row->is_on));
        return holder;
    }
    if (part == "elm.icon.bar" && row->used >= 0) {
        Evas_Object *bar = progress_add(list, "storage", row->used);
        elm_progressbar_pulse(bar, EINA_FALSE);
        if (row->used >= 0.9)
            elm_layout_signal_emit(bar, "elm,state,warning", "");
        return bar;
    }
    return nullptr;
}

template <size_t N> Evas_Object *list_add(Evas_Object *parent, const Row (&rows)[N])
{
    Evas_Object *list = elm_genlist_add(parent);
    elm_genlist_mode_set(list, ELM_LIST_COMPRESS);
    evas_object_smart_callback_add(
        list, "realized",
        [](void *, Evas_Object *, void *item) {
            auto *it = static_cast<Elm_Object_Item *>(item);
            if (const char *position = static_cast<const Row *>(elm_object_item_data_get(it))->position)
                elm_object_item_signal_emit(it, position, "");
        },
        nullptr);
    expand(list);
    for (const Row &row : rows) {
        Elm_Genlist_Item_Class *itc = elm_genlist_item_class_new();
        itc->item_style = row.style;
        itc->func.text_get = text_get;
        itc->func.content_get = content_get;
        Elm_Object_Item *item =
            elm_genlist_item_append(list, itc, &row, nullptr, ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
        elm_object_item_disabled_set(item, row.is_disabled);
        elm_genlist_item_class_free(itc);
    }
    return list;
}

Evas_Object *page_with(Evas_Object *win)
{
    Evas_Object *frame = frame_add(win);
    Evas_Object *list = list_add(frame, settings_rows);
    Elm_Object_Item *page = page_add(frame, "Velora", list);
    elm_object_item_part_content_set(page, "toolbar_more_btn", button_add(frame, "naviframe/more/default", "Mehr"));
    return list;
}

} // namespace

void settings(Evas_Object *win)
{
    page_with(win);
}

void settings_end(Evas_Object *win)
{
    Evas_Object *list = page_with(win);
    ecore_timer_add(
        0.2,
        [](void *data) {
            auto *rows = static_cast<Evas_Object *>(data);
            elm_genlist_item_show(elm_genlist_last_item_get(rows), ELM_GENLIST_ITEM_SCROLLTO_IN);
            elm_genlist_item_selected_set(elm_genlist_nth_item_get(rows, 12), EINA_TRUE);
            return ECORE_CALLBACK_CANCEL;
        },
        list);
}

void settings_schedule(Evas_Object *win)
{
    page_with(win);
    Evas_Object *popup = elm_popup_add(win);
    elm_object_part_text_set(popup, "title,text", "Synchronisierungszeitplan");
    Evas_Object *table = elm_table_add(popup);
    expand(table);
    Evas_Object *height = evas_object_rectangle_add(evas_object_evas_get(win));
    evas_object_size_hint_min_set(height, 0, ELM_SCALE_SIZE(288));
    evas_object_size_hint_weight_set(height, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_table_pack(table, height, 0, 0, 1, 1);
    Evas_Object *list = list_add(table, schedule_rows);
    if (!elm_object_style_set(list, "popup"))
        missing("list style ", "popup");
    elm_table_pack(table, list, 0, 0, 1, 1);
    elm_object_content_set(popup, table);
    evas_object_show(popup);
}

void settings_first(Evas_Object *win)
{
    Evas_Object *frame = frame_add(win);
    Elm_Object_Item *page = page_add(frame, "Inhalte zu Velora hochladen", list_add(frame, first_rows));
    elm_object_item_part_content_set(page, "toolbar", button_add(frame, "bottom", "Überspringen"));
}

void switches(Evas_Object *win)
{
    Evas_Object *frame = frame_add(win);
    Evas_Object *box = elm_box_add(frame);
    expand(box);
    for (const bool is_radio : {false, true}) {
        Evas_Object *line = elm_box_add(box);
        elm_box_horizontal_set(line, EINA_TRUE);
        elm_box_padding_set(line, ELM_SCALE_SIZE(16), 0);
        evas_object_show(line);
        for (int kind = 0; kind < 4; ++kind) {
            Evas_Object *one = is_radio ? elm_radio_add(line) : toggle_add(line, kind & 1);
            if (is_radio) {
                elm_radio_state_value_set(one, 1);
                elm_radio_value_set(one, kind & 1);
            }
            elm_object_disabled_set(one, kind >= 2);
            evas_object_show(one);
            elm_box_pack_end(line, one);
        }
        elm_box_pack_end(box, line);
    }
    Evas_Object *radio = elm_radio_add(box);
    elm_object_text_set(radio, "Nur über WLAN");
    expand(radio);
    elm_box_pack_end(box, radio);
    for (const double value : {0.0, 0.35, 1.0}) {
        Evas_Object *bar = progress_add(box, "storage", value);
        elm_progressbar_pulse(bar, EINA_FALSE);
        elm_layout_signal_emit(bar, value < 1 ? "elm,state,normal" : "elm,state,warning", "");
        elm_box_pack_end(box, bar);
    }
    for (const bool is_disabled : {false, true}) {
        Evas_Object *button = button_add(box, "contacts", "Kamera-Upload zu Velora aktivieren");
        elm_object_disabled_set(button, is_disabled);
        evas_object_size_hint_align_set(button, EVAS_HINT_FILL, 0.5);
        elm_box_pack_end(box, button);
    }
    page_add(frame, "Schalter", box);
}
