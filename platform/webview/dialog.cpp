// What a page asks a person, in popups of ours, and what it must not ask.
#include "menu.h"
#include <gtk/gtk.h>
#include <libintl.h>

namespace {
// The toolkit's words for buttons, in the person's language.
std::string word(const char *text)
{
    std::string label = dgettext("gtk30", text);
    std::erase(label, '_');
    return markup_of(label.c_str());
}

void popup_deleted(void *data, Evas *, Evas_Object *popup, void *)
{
    const std::unique_ptr<std::function<void()>> ended(static_cast<std::function<void()> *>(data));
    auto *view = static_cast<View *>(evas_object_data_get(popup, "view"));
    const Hold hold(*view);
    if (view->popup == popup)
        view->popup = nullptr;
    (*ended)();
}

void popup_close(void *, Evas_Object *popup, void *)
{
    popup_close_soon(popup);
}

// A question of the page's script, which stands still until it is answered.
struct Dialog {
    View *view;
    WebKitScriptDialog *dialog;
    Evas_Object *popup;
    Evas_Object *entry; // null without one
};

void agreed(void *data, Evas_Object *, void *)
{
    const auto *asked = static_cast<Dialog *>(data);
    if (webkit_script_dialog_get_dialog_type(asked->dialog) == WEBKIT_SCRIPT_DIALOG_CONFIRM)
        webkit_script_dialog_confirm_set_confirmed(asked->dialog, TRUE);
    if (asked->entry) {
        char *text = elm_entry_markup_to_utf8(elm_entry_entry_get(asked->entry));
        webkit_script_dialog_prompt_set_text(asked->dialog, text ? text : "");
        free(text);
    }
    popup_close_soon(asked->popup);
}

void refused(void *data, Evas_Object *, void *)
{
    popup_close_soon(static_cast<Dialog *>(data)->popup);
}

void button_add(Dialog *asked, const char *part, const char *text, Evas_Smart_Cb clicked, bool is_primary)
{
    Evas_Object *button = elm_button_add(asked->popup);
    elm_object_style_set(button, "popup");
    elm_object_text_set(button, word(text).c_str());
    elm_object_part_content_set(asked->popup, part, button);
    evas_object_smart_callback_add(button, "clicked", clicked, asked);
    if (is_primary)
        elm_layout_signal_emit(button, "platform,button,primary", "platform");
}

gboolean script_dialog(WebKitWebView *, WebKitScriptDialog *dialog, gpointer data)
{
    View &view = view_of(data);
    const Hold hold(view);
    const WebKitScriptDialogType type = webkit_script_dialog_get_dialog_type(dialog);
    if (type == WEBKIT_SCRIPT_DIALOG_BEFORE_UNLOAD_CONFIRM) { // pages do not keep anyone
        webkit_script_dialog_confirm_set_confirmed(dialog, TRUE);
        return TRUE;
    }
    auto *asked = new Dialog{&view, webkit_script_dialog_ref(dialog), elm_popup_add(view.window), nullptr};
    elm_popup_scrollable_set(asked->popup, EINA_TRUE);
    const std::string text = markup_of(webkit_script_dialog_get_message(dialog));
    if (type == WEBKIT_SCRIPT_DIALOG_PROMPT) {
        elm_object_part_text_set(asked->popup, "title,text", text.c_str());
        asked->entry = elm_entry_add(asked->popup);
        elm_entry_single_line_set(asked->entry, EINA_TRUE);
        elm_entry_scrollable_set(asked->entry, EINA_TRUE);
        elm_object_text_set(asked->entry, markup_of(webkit_script_dialog_prompt_get_default_text(dialog)).c_str());
        elm_object_content_set(asked->popup, asked->entry);
    } else {
        elm_object_text_set(asked->popup, text.c_str());
    }
    if (type == WEBKIT_SCRIPT_DIALOG_ALERT) {
        button_add(asked, "button1", "_OK", agreed, true);
    } else {
        button_add(asked, "button1", "_Cancel", refused, false);
        button_add(asked, "button2", "_OK", agreed, true);
    }
    popup_set(view, asked->popup, [asked] {
        webkit_script_dialog_close(asked->dialog);
        webkit_script_dialog_unref(asked->dialog);
        delete asked;
    });
    return TRUE;
}

// A list of choices (<select>).
void picked(void *data, Evas_Object *popup, void *item)
{
    const auto index = reinterpret_cast<uintptr_t>(elm_object_item_data_get(static_cast<Elm_Object_Item *>(item)));
    webkit_option_menu_activate_item(static_cast<WebKitOptionMenu *>(data), static_cast<guint>(index));
    popup_close_soon(popup);
}

gboolean option_menu(WebKitWebView *, WebKitOptionMenu *menu, GdkEvent *, GdkRectangle *place, gpointer data)
{
    View &view = view_of(data);
    const Hold hold(view);
    Evas_Object *popup = ctxpopup_new(view, place->x + place->width / 2, place->y + place->height);
    for (guint i = 0; i < webkit_option_menu_get_n_items(menu); i++) {
        WebKitOptionMenuItem *item = webkit_option_menu_get_item(menu, i);
        const std::string label = markup_of(webkit_option_menu_item_get_label(item));
        Elm_Object_Item *row = elm_ctxpopup_item_append(popup, label.c_str(), nullptr, picked, menu);
        elm_object_item_data_set(row, reinterpret_cast<void *>(static_cast<uintptr_t>(i)));
        elm_object_item_disabled_set(row, !webkit_option_menu_item_is_enabled(item) ||
                                              webkit_option_menu_item_is_group_label(item));
    }
    g_object_ref(menu);
    g_signal_connect(menu, "close", G_CALLBACK(+[](WebKitOptionMenu *, gpointer closed) {
                         evas_object_del(static_cast<Evas_Object *>(closed));
                     }),
                     popup);
    popup_set(view, popup, [menu, popup] {
        g_signal_handlers_disconnect_by_data(menu, popup);
        webkit_option_menu_close(menu);
        g_object_unref(menu);
    });
    return TRUE;
}

gboolean refuse_all(WebKitWebView *, gpointer, gpointer)
{
    return TRUE;
}
} // namespace

std::string markup_of(const char *text)
{
    char *markup = elm_entry_utf8_to_markup(text ? text : "");
    std::string result = markup ? markup : "";
    free(markup);
    return result;
}

void popup_close_soon(Evas_Object *popup)
{
    ecore_job_add(
        [](void *closing) {
            for (const View *view : views())
                if (view->popup == closing) {
                    evas_object_del(view->popup);
                    return;
                }
        },
        popup);
}

Evas_Object *ctxpopup_new(View &view, int x, int y)
{
    Evas_Object *popup = elm_ctxpopup_add(view.window);
    elm_ctxpopup_hover_parent_set(popup, view.window);
    int left = 0, top = 0;
    evas_object_geometry_get(view.image, &left, &top, nullptr, nullptr);
    evas_object_move(popup, left + x, top + y);
    return popup;
}

void popup_set(View &view, Evas_Object *popup, std::function<void()> ended)
{
    evas_object_del(view.popup);
    view.popup = popup;
    evas_object_data_set(popup, "view", &view);
    evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, popup_deleted,
                                   new std::function<void()>(std::move(ended)));
    evas_object_smart_callback_add(popup, "dismissed", popup_close, nullptr);
    host->back_key_add(popup, popup_close, nullptr);
    evas_object_show(popup);
}

void dialog_connect(View &view)
{
    g_signal_connect(view.page, "script-dialog", G_CALLBACK(script_dialog), &view);
    g_signal_connect(view.page, "show-option-menu", G_CALLBACK(option_menu), &view);
    g_signal_connect(view.page, "permission-request",
                     G_CALLBACK(+[](WebKitWebView *, WebKitPermissionRequest *request, gpointer) -> gboolean {
                         webkit_permission_request_deny(request);
                         return TRUE;
                     }),
                     nullptr);
    g_signal_connect(view.page, "run-file-chooser",
                     G_CALLBACK(+[](WebKitWebView *, WebKitFileChooserRequest *request, gpointer) -> gboolean {
                         webkit_file_chooser_request_cancel(request);
                         return TRUE;
                     }),
                     nullptr);
    g_signal_connect(view.page, "authenticate",
                     G_CALLBACK(+[](WebKitWebView *, WebKitAuthenticationRequest *request, gpointer) -> gboolean {
                         webkit_authentication_request_cancel(request);
                         return TRUE;
                     }),
                     nullptr);
    for (const char *signal : {"run-color-chooser", "print", "show-notification"})
        g_signal_connect(view.page, signal, G_CALLBACK(refuse_all), nullptr);
}
