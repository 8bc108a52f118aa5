#include "scenes.h"
#include "pieces.h"
#include "settings.h"
#include <Elementary.h>
#include <string>

namespace {

enum class Row { folder, file, running, waiting, failed, uploaded, select_all, checked };

struct RowData {
    Row kind;
    const char *name; // plain text
    const char *icon; // name of the picture without its prefix and suffix
    double progress;
};

constexpr RowData browse_rows[] = {
    {Row::folder, "Bilder", "folder", 0},
    {Row::folder, "Rechnungen, Steuerunterlagen und Versicherungen der letzten Jahre", "folder", 0},
    {Row::folder, "A & B <geteilt>", "folder", 0},
    {Row::file, "IMG_20141122_2146.jpg", "images", 0},
    {Row::file, "Urlaub.mp4", "video", 0},
    {Row::file, "회의록 2014년 11월.hwp", "hwp", 0},
    {Row::file, "Donaudampfschifffahrtsgesellschaftskapitänsmütze.pdf", "pdf", 0},
    {Row::file, "notes.txt", "text", 0},
    {Row::file, "Budget.xlsx", "excel", 0},
    {Row::file, "kontakt.vcf", "vcard", 0},
    {Row::file, "memo.amr", "amr", 0},
    {Row::file, "index.html", "html", 0},
};
constexpr RowData upload_rows[] = {
    {Row::running, "IMG_20141122_214612_Panorama_Donau_Ufer.jpg", "images", 0.42},
    {Row::running, "Urlaub.mp4", "video", 0.03},
    {Row::waiting, "Präsentation <Entwurf> & Notizen.pptx", "ppt", 0},
    {Row::waiting, "song.mp3", "music", 0},
    {Row::failed, "Vertrag_unterschrieben_und_eingescannt_2014-11-22.pdf", "pdf", 0},
    {Row::uploaded, "Brief.docx", "word", 0},
    {Row::uploaded, "IMG_20141122_214613_Panorama_Donau_Ufer (2).jpg", "images", 0},
    {Row::failed, "song.mp3", "music", 0},
};
// Names that are hard to shorten, in both kinds of rows.
constexpr RowData name_rows[] = {
    {Row::uploaded, "🎉 party 👍.jpg", "images", 0},
    {Row::failed, "Flags 🇩🇪🇰🇷 and hands 👋🏽👩‍👩‍👧 of all that were there.jpg", "images",
     0},
    {Row::uploaded, "العقد النهائي الموقع بين الطرفين بتاريخ 2014-11-22.pdf", "pdf", 0},
    {Row::running, "חוזה שכירות חתום ע״י שני הצדדים (עותק 2).pdf", "pdf", 0.7},
    {Row::uploaded, "プロジェクト計画書二〇一四年度最終版修正済み(二).docx", "word", 0},
    {Row::folder, "<b>Rechnungen</b> & Steuerunterlagen &amp; Belege <2014>", "folder", 0},
    {Row::folder, "회의록 보관함 그리고 지난 몇 년 동안의 모든 회의 자료 2014", "folder", 0},
};
constexpr RowData select_rows[] = {
    {Row::checked, "IMG_20141122_214612_Panorama_Donau_Ufer.jpg", "images", 0.42},
    {Row::checked, "Urlaub.mp4", "video", 0},
    {Row::checked, "song.mp3", "music", 0},
};
constexpr RowData select_all_row = {Row::select_all, "Alle auswählen", nullptr, 0};

char *row_text(void *data, Evas_Object *, const char *part)
{
    const auto *row = static_cast<const RowData *>(data);
    if (std::string_view(part) == "elm.text.sub.left.bottom")
        return strdup("Hochladen fehlgeschlagen");
    return elm_entry_utf8_to_markup(row->name);
}

Evas_Object *row_content(void *data, Evas_Object *list, const char *part_name)
{
    const auto *row = static_cast<const RowData *>(data);
    const std::string_view part = part_name;
    const bool queued = row->kind == Row::running || row->kind == Row::waiting;
    if (part == "elm.icon" && row->icon) {
        const bool folder = row->kind == Row::folder;
        Evas_Object *holder = folder ? theme_layout_add(list, "list/B/type.2") : layout_add(list, "genlist_content");
        elm_object_part_content_set(holder, "elm.swallow.content",
                                    picture_add(list, std::string("docshelf_icon_") + row->icon + ".png"));
        if (std::string_view(row->icon) == "video")
            elm_layout_signal_emit(holder, "elm.video.show", "elm");
        return holder;
    }
    if (part == "elm.icon.2" && queued) {
        Evas_Object *holder = theme_layout_add(list, "list/C/type.3");
        elm_object_part_content_set(holder, "elm.swallow.content", button_add(list, "editfield_clear", "Abbrechen"));
        return holder;
    }
    if (part == "elm.icon.2" && (row->kind == Row::uploaded || row->kind == Row::failed))
        return picture_add(list, row->kind == Row::failed ? "velora_icon_retry" : "velora_icon_done");
    if (part == "elm.icon.2" && (row->kind == Row::select_all || row->kind == Row::checked)) {
        Evas_Object *holder = theme_layout_add(list, "list/C/type.1");
        Evas_Object *check = elm_check_add(list);
        elm_check_state_set(check, row->progress > 0);
        elm_object_part_content_set(holder, "elm.swallow.content", check);
        return holder;
    }
    if (part == "elm.swallow.progressbar")
        return progress_add(list, row->kind == Row::running ? "list_progress" : "pending_custom", row->progress);
    return nullptr;
}

Eina_Bool row_state(void *data, Evas_Object *, const char *state)
{
    return std::string_view(state) == "failed" && static_cast<const RowData *>(data)->kind == Row::failed;
}

Evas_Object *list_add(Evas_Object *parent)
{
    Evas_Object *list = elm_genlist_add(parent);
    if (!elm_object_style_set(list, "dialogue"))
        missing("list style ", "dialogue");
    elm_genlist_mode_set(list, ELM_LIST_COMPRESS);
    expand(list);
    return list;
}

void row_append(Evas_Object *list, const RowData &row)
{
    const char *style = "1line";
    if (row.kind == Row::failed)
        style = "2line.top";
    else if (row.kind == Row::running || row.kind == Row::waiting || row.kind == Row::checked)
        style = "2line.velora";
    Elm_Genlist_Item_Class *itc = elm_genlist_item_class_new();
    itc->item_style = style;
    itc->func.text_get = row_text;
    itc->func.content_get = row_content;
    itc->func.state_get = row_state;
    elm_genlist_item_append(list, itc, &row, nullptr, ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
    elm_genlist_item_class_free(itc);
}

Evas_Object *path_add(Evas_Object *parent)
{
    Evas_Object *path = elm_toolbar_add(parent);
    if (!elm_object_style_set(path, "navigationbar"))
        missing("toolbar style ", "navigationbar");
    elm_toolbar_shrink_mode_set(path, ELM_TOOLBAR_SHRINK_SCROLL);
    elm_toolbar_transverse_expanded_set(path, EINA_TRUE);
    elm_toolbar_align_set(path, 0.0);
    elm_toolbar_homogeneous_set(path, EINA_FALSE);
    elm_toolbar_select_mode_set(path, ELM_OBJECT_SELECT_MODE_NONE);
    Elm_Object_Item *item = nullptr;
    for (const char *name : {"Velora", "Dokumente", "2014", "Rechnungen &amp; Belege", "Versicherungen", "November"})
        item = elm_toolbar_item_append(path, nullptr, name, nullptr, nullptr);
    evas_object_show(path);
    ecore_timer_add(
        0.1,
        [](void *last) {
            elm_toolbar_item_bring_in(static_cast<Elm_Object_Item *>(last), ELM_TOOLBAR_ITEM_SCROLLTO_LAST);
            return ECORE_CALLBACK_CANCEL;
        },
        item);
    return path;
}

void words_add(Evas_Object *frame, Elm_Object_Item *page, bool done_disabled)
{
    elm_object_item_part_content_set(page, "title_left_text_btn",
                                     button_add(frame, "naviframe/title_text_left", "Abbrechen"));
    Evas_Object *done = button_add(frame, "naviframe/title_text_right", "Fertig");
    elm_object_disabled_set(done, done_disabled);
    elm_object_item_part_content_set(page, "title_right_text_btn", done);
}

template <size_t N> Elm_Object_Item *list_page(Evas_Object *win, const char *title, const RowData (&rows)[N], bool path)
{
    Evas_Object *frame = frame_add(win);
    Evas_Object *layout = layout_add(frame, "main");
    if (path)
        elm_object_part_content_set(layout, "elm.swallow.folder", path_add(frame));
    Evas_Object *list = list_add(frame);
    for (const RowData &row : rows)
        row_append(list, row);
    elm_object_part_content_set(layout, "elm.swallow.genlist", list);
    Elm_Object_Item *page = page_add(frame, title, layout);
    elm_object_item_part_content_set(page, "toolbar_more_btn", button_add(frame, "naviframe/more/default", "Mehr"));
    if (!path)
        elm_layout_signal_emit(layout, "elm.navi.hide", "elm");
    evas_object_data_set(win, "layout", layout);
    evas_object_data_set(win, "frame", frame);
    return page;
}

// The line between the bar and the list; a progress below 0 shows no bar.
void info_add(Evas_Object *win, const char *text, double progress)
{
    auto *layout = static_cast<Evas_Object *>(evas_object_data_get(win, "layout"));
    if (!elm_layout_text_set(layout, "velora.text.info", text))
        missing("part ", "velora.text.info");
    if (progress >= 0 &&
        !elm_layout_content_set(layout, "velora.swallow.progress", progress_add(layout, "overall", progress)))
        missing("part ", "velora.swallow.progress");
    elm_layout_signal_emit(layout, "velora,info,show", "velora");
}

void browse(Evas_Object *win)
{
    Elm_Object_Item *page = list_page(win, "Hochladen nach", browse_rows, true);
    info_add(win, "36 Dateien, 80.12 MB", -1);
    words_add(static_cast<Evas_Object *>(evas_object_data_get(win, "frame")), page, false);
}

void uploads(Evas_Object *win)
{
    list_page(win, "Velora-Uploads in den gemeinsamen Ordner", upload_rows, false);
    info_add(win, "3 von 36 · 12.00 MB von 80.12 MB", 0.15);
}

void names(Evas_Object *win)
{
    list_page(win, "Namen", name_rows, false);
}

void selecting(Evas_Object *win)
{
    Elm_Object_Item *page = list_page(win, "1 ausgewählt", select_rows, true);
    auto *layout = static_cast<Evas_Object *>(evas_object_data_get(win, "layout"));
    auto *frame = static_cast<Evas_Object *>(evas_object_data_get(win, "frame"));
    Evas_Object *list = list_add(layout);
    elm_scroller_policy_set(list, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
    row_append(list, select_all_row);
    elm_object_part_content_set(layout, "elm.swallow.folder", list);
    elm_layout_signal_emit(layout, "elm.navi.show.select.all", "elm");
    words_add(frame, page, true);
}

Evas_Object *popup_add(Evas_Object *win, const char *title, const char *text, bool fill = false, bool scroll = false)
{
    browse(win);
    Evas_Object *popup = elm_popup_add(win);
    if (fill)
        elm_popup_align_set(popup, ELM_NOTIFY_ALIGN_FILL, 1.0);
    if (scroll)
        elm_popup_scrollable_set(popup, EINA_TRUE);
    if (title)
        elm_object_part_text_set(popup, "title,text", title);
    if (text)
        elm_object_text_set(popup, text);
    evas_object_show(popup);
    return popup;
}

void popup_button(Evas_Object *popup, const char *part, const char *text, const char *signal = nullptr)
{
    Evas_Object *button = button_add(popup, "popup", text);
    elm_object_part_content_set(popup, part, button);
    if (signal)
        elm_layout_signal_emit(button, signal, "platform");
}

void popup_1(Evas_Object *win)
{
    popup_button(popup_add(win, nullptr, "Ein Serverfehler ist aufgetreten. Versuchen Sie es später noch einmal."),
                 "button1", "OK");
}

void popup_2(Evas_Object *win)
{
    Evas_Object *popup = popup_add(win, "Hochladen anhalten",
                                   "Das Hochladen wird angehalten, aber die Datei wird nicht gelöscht.", true);
    popup_button(popup, "button1", "Abbrechen");
    popup_button(popup, "button2", "Anhalten", "platform,button,primary");
}

void popup_2_plain(Evas_Object *win)
{
    Evas_Object *popup =
        popup_add(win, "Konto entfernen", "Alle Daten dieses Kontos werden von diesem Gerät entfernt.");
    popup_button(popup, "button1", "Abbrechen");
    popup_button(popup, "button2", "Konto entfernen", "platform,button,destructive");
}

void popup_3_with(Evas_Object *win, bool fill, bool scroll)
{
    Evas_Object *popup = popup_add(win, "Keine Netzwerkverbindung",
                                   "Mobile Daten sind deaktiviert. Stellen Sie eine Verbindung mit einem WLAN her oder "
                                   "aktivieren Sie mobile Daten und versuchen Sie es noch einmal.",
                                   fill, scroll);
    popup_button(popup, "button1", "Abbrechen");
    popup_button(popup, "button2", "WLAN");
    popup_button(popup, "button3", "Einstellungen");
}

void popup_3(Evas_Object *win)
{
    popup_3_with(win, false, false);
}

void popup_3_fill(Evas_Object *win)
{
    popup_3_with(win, true, false);
}

void popup_3_scroll(Evas_Object *win)
{
    popup_3_with(win, false, true);
}

void popup_3_fill_scroll(Evas_Object *win)
{
    popup_3_with(win, true, true);
}

void processing(Evas_Object *win)
{
    Evas_Object *popup = popup_add(win, nullptr, nullptr);
    Evas_Object *layout = layout_add(popup, "popup_processing");
    elm_object_part_content_set(layout, "elm.swallow.icon", progress_add(layout, "process_large", 0));
    elm_object_content_set(popup, layout);
}

void processing_cancel(Evas_Object *win)
{
    Evas_Object *popup = popup_add(win, nullptr, nullptr);
    Evas_Object *layout = layout_add(popup, "popup_processingview_1button");
    elm_object_part_text_set(layout, "elm.swallow.text", "Verarbeitung läuft...");
    elm_object_part_content_set(layout, "elm.swallow.content", progress_add(layout, "process_large", 0));
    elm_object_content_set(popup, layout);
    popup_button(popup, "button1", "Abbrechen");
}

void processing_text(Evas_Object *win)
{
    Evas_Object *popup = popup_add(win, "Konto entfernen", nullptr);
    Evas_Object *outer = layout_add(popup, "velora.popup.processing");
    Evas_Object *inner = layout_add(outer, "left,icon,right,text");
    elm_object_part_content_set(inner, "processing_icon", progress_add(inner, "process_medium", 0));
    elm_object_part_text_set(inner, "processing_text", "Wird entfernt...");
    elm_object_part_content_set(outer, "processing_content", inner);
    elm_object_content_set(popup, outer);
}

void menu(Evas_Object *win)
{
    uploads(win);
    Evas_Object *popup = elm_ctxpopup_add(win);
    if (!elm_object_style_set(popup, "more/default"))
        missing("menu style ", "more/default");
    elm_ctxpopup_auto_hide_disabled_set(popup, EINA_TRUE);
    elm_ctxpopup_item_append(popup, "Entfernen", nullptr, nullptr, nullptr);
    elm_ctxpopup_item_append(popup, "Einstellungen des Kontos", nullptr, nullptr, nullptr);
    elm_ctxpopup_direction_priority_set(popup, ELM_CTXPOPUP_DIRECTION_UP, ELM_CTXPOPUP_DIRECTION_LEFT,
                                        ELM_CTXPOPUP_DIRECTION_RIGHT, ELM_CTXPOPUP_DIRECTION_DOWN);
    int w = 0, h = 0;
    evas_object_geometry_get(win, nullptr, nullptr, &w, &h);
    evas_object_move(popup, w / 2, h);
    evas_object_show(popup);
}

void state(Evas_Object *win, const char *picture, const char *title, const char *text, const char *action)
{
    browse(win);
    auto *layout = static_cast<Evas_Object *>(evas_object_data_get(win, "layout"));
    Evas_Object *place = layout_add(layout, "velora.state");
    elm_object_part_content_set(place, "velora.icon", picture_add(place, picture));
    elm_object_part_text_set(place, "velora.title", title);
    elm_object_part_text_set(place, "velora.text", text);
    if (action)
        elm_object_part_content_set(place, "velora.swallow.action", button_add(place, nullptr, action));
    elm_object_part_content_set(layout, "velora.swallow.state", place);
    elm_layout_signal_emit(layout, "velora,state,show", "velora");
}

void state_empty(Evas_Object *win)
{
    state(win, "velora_state_empty", "Dieser Ordner ist leer",
          "Tippen Sie auf „Fertig“, um die Dateien hierher hochzuladen.", nullptr);
}

void state_offline(Evas_Object *win)
{
    state(win, "velora_state_offline", "Keine Netzwerkverbindung",
          "Stellen Sie eine Verbindung mit einem WLAN her und versuchen Sie es noch einmal.", "Erneut versuchen");
}

void state_error(Evas_Object *win)
{
    state(win, "velora_state_error", "Der Ordner kann nicht geöffnet werden",
          "Der Dienst antwortet nicht. Versuchen Sie es später noch einmal.", "Erneut versuchen");
}

void state_loading(Evas_Object *win)
{
    state(win, "velora_state_loading", "Wird geladen...", "Die Liste der Ordner wird geholt.", nullptr);
}

void state_stopped(Evas_Object *win)
{
    state(win, "velora_state_stopped", "Nichts mehr hochzuladen",
          "Das Hochladen wurde beendet. Die Dateien sind weiterhin auf diesem Gerät", nullptr);
}

void icons(Evas_Object *win)
{
    Evas_Object *frame = frame_add(win);
    Evas_Object *table = elm_table_add(frame);
    int cell = 0;
    for (const int size : {40, 56})
        for (const char *name : {"folder", "images", "video", "music", "amr", "pdf", "word", "ppt", "excel", "html",
                                 "text", "vcard", "vcalender", "rss", "tpk", "snb", "hwp", "etc"}) {
            Evas_Object *image = picture_add(table, std::string("docshelf_icon_") + name + ".png");
            const int side = ELM_SCALE_SIZE(size);
            evas_object_size_hint_min_set(image, side, side);
            evas_object_size_hint_max_set(image, side, side);
            elm_table_pack(table, image, cell % 6, cell / 6, 1, 1);
            ++cell;
        }
    page_add(frame, "Symbole", table);
}

void controls(Evas_Object *win)
{
    Evas_Object *frame = frame_add(win);
    Evas_Object *box = elm_box_add(frame);
    expand(box);
    for (const char *style : {"default", "popup", "bottom", "naviframe/title_text_left", "editfield_clear"}) {
        Evas_Object *line = elm_box_add(box);
        elm_box_horizontal_set(line, EINA_TRUE);
        elm_box_padding_set(line, 8, 0);
        evas_object_show(line);
        for (int kind = 0; kind < 4; ++kind) {
            static constexpr const char *texts[] = {"Normal", "Aus", "Druck", "Fokus"};
            Evas_Object *button = button_add(line, style, texts[kind]);
            elm_object_disabled_set(button, kind == 1);
            if (kind == 2)
                edje_object_signal_emit(elm_layout_edje_get(button), "mouse,down,1", "event");
            if (kind == 3)
                elm_layout_signal_emit(button, "elm,action,focus", "elm");
            elm_box_pack_end(line, button);
        }
        elm_box_pack_end(box, line);
    }
    Evas_Object *line = elm_box_add(box);
    elm_box_horizontal_set(line, EINA_TRUE);
    evas_object_show(line);
    for (int kind = 0; kind < 4; ++kind) {
        Evas_Object *check = elm_check_add(line);
        elm_check_state_set(check, kind & 1);
        elm_object_disabled_set(check, kind >= 2);
        evas_object_show(check);
        elm_box_pack_end(line, check);
    }
    elm_box_pack_end(box, line);
    Evas_Object *check = elm_check_add(box);
    elm_object_text_set(check, "Nur über WLAN");
    elm_check_state_set(check, EINA_TRUE);
    expand(check);
    elm_box_pack_end(box, check);
    for (const double value : {0.0, 0.35, 1.0})
        elm_box_pack_end(box, progress_add(box, "list_progress", value));
    elm_box_pack_end(box, progress_add(box, "pending_custom", 0));
    Evas_Object *label = elm_label_add(box);
    elm_label_line_wrap_set(label, ELM_WRAP_MIXED);
    elm_object_text_set(label,
                        "Ein längerer Text, der umbricht, wenn die Zeile zu Ende ist, und <b>fett</b> sein kann.");
    expand(label);
    elm_box_pack_end(box, label);
    Elm_Object_Item *page = page_add(frame, "Bedienelemente", box);
    Evas_Object *bottom = layout_add(frame, "emergency_unlock_bottom_button");
    elm_object_part_content_set(bottom, "emergency_btn", button_add(bottom, "bottom", "Zurück"));
    elm_object_part_content_set(bottom, "unlock_btn", button_add(bottom, "bottom", "Konto entfernen"));
    elm_object_item_part_content_set(page, "toolbar", bottom);
}

} // namespace

const std::vector<Scene> &gallery_scenes()
{
    static const std::vector<Scene> scenes = {
        {"browse", browse},
        {"uploads", uploads},
        {"names", names},
        {"select", selecting},
        {"popup-1", popup_1},
        {"popup-2-fill", popup_2},
        {"popup-2", popup_2_plain},
        {"popup-3", popup_3},
        {"popup-3-fill", popup_3_fill},
        {"popup-3-scroll", popup_3_scroll},
        {"popup-3-fill-scroll", popup_3_fill_scroll},
        {"processing", processing},
        {"processing-cancel", processing_cancel},
        {"processing-text", processing_text},
        {"menu", menu},
        {"state-empty", state_empty},
        {"state-offline", state_offline},
        {"state-error", state_error},
        {"state-loading", state_loading},
        {"state-stopped", state_stopped},
        {"icons", icons},
        {"controls", controls},
        {"settings", settings},
        {"settings-end", settings_end},
        {"settings-schedule", settings_schedule},
        {"settings-first", settings_first},
        {"switches", switches},
    };
    return scenes;
}
