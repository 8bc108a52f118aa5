#include "im.h"
#include <Ecore_IMF.h>
#include <Ecore_IMF_Evas.h>

// What the engine asks, answered by Ecore's context. Lives as long as the page, longer than the view.
struct InputMethod {
    WebKitInputMethodContext parent;
    View *view;
    Ecore_IMF_Context *context; // null where there is no input method
    bool is_editing;
    bool is_composing;
};

namespace {
struct InputMethodClass {
    WebKitInputMethodContextClass parent;
};

G_DEFINE_TYPE(InputMethod, input_method, WEBKIT_TYPE_INPUT_METHOD_CONTEXT)

InputMethod *own(WebKitInputMethodContext *method)
{
    return reinterpret_cast<InputMethod *>(method);
}

Ecore_IMF_Input_Panel_Layout layout_of(WebKitInputPurpose purpose)
{
    switch (purpose) {
    case WEBKIT_INPUT_PURPOSE_DIGITS:
        return ECORE_IMF_INPUT_PANEL_LAYOUT_NUMBERONLY;
    case WEBKIT_INPUT_PURPOSE_NUMBER:
        return ECORE_IMF_INPUT_PANEL_LAYOUT_NUMBER;
    case WEBKIT_INPUT_PURPOSE_PHONE:
        return ECORE_IMF_INPUT_PANEL_LAYOUT_PHONENUMBER;
    case WEBKIT_INPUT_PURPOSE_URL:
        return ECORE_IMF_INPUT_PANEL_LAYOUT_URL;
    case WEBKIT_INPUT_PURPOSE_EMAIL:
        return ECORE_IMF_INPUT_PANEL_LAYOUT_EMAIL;
    case WEBKIT_INPUT_PURPOSE_PASSWORD:
        return ECORE_IMF_INPUT_PANEL_LAYOUT_PASSWORD;
    default:
        return ECORE_IMF_INPUT_PANEL_LAYOUT_NORMAL;
    }
}

// The panel and the method are there while a field of the page is edited and the view has the focus.
void settle(InputMethod &method)
{
    if (!method.context)
        return;
    auto *engine = &method.parent;
    if (!method.is_editing || !method.view || !method.view->has_focus) {
        ecore_imf_context_reset(method.context);
        ecore_imf_context_focus_out(method.context);
        ecore_imf_context_input_panel_hide(method.context);
        return;
    }
    const WebKitInputPurpose purpose = webkit_input_method_context_get_input_purpose(engine);
    const bool is_secret = purpose == WEBKIT_INPUT_PURPOSE_PASSWORD;
    ecore_imf_context_input_panel_layout_set(method.context, layout_of(purpose));
    ecore_imf_context_prediction_allow_set(method.context, !is_secret);
    ecore_imf_context_input_hint_set(method.context,
                                     is_secret ? ECORE_IMF_INPUT_HINT_SENSITIVE_DATA : ECORE_IMF_INPUT_HINT_NONE);
    ecore_imf_context_focus_in(method.context);
    if (!(webkit_input_method_context_get_input_hints(engine) & WEBKIT_INPUT_HINT_INHIBIT_OSK))
        ecore_imf_context_input_panel_show(method.context);
}

void editing_set(WebKitInputMethodContext *engine, bool is_editing)
{
    own(engine)->is_editing = is_editing;
    settle(*own(engine));
}

void composing_set(InputMethod &method, bool is_composing)
{
    if (method.is_composing != is_composing)
        g_signal_emit_by_name(&method, is_composing ? "preedit-started" : "preedit-finished");
    method.is_composing = is_composing;
}

void preedit_get(WebKitInputMethodContext *engine, char **text, GList **underlines, guint *cursor)
{
    char *string = nullptr;
    int position = 0;
    if (own(engine)->context)
        ecore_imf_context_preedit_string_get(own(engine)->context, &string, &position);
    const auto length = static_cast<guint>(string ? g_utf8_strlen(string, -1) : 0);
    if (text)
        *text = g_strdup(string ? string : "");
    if (underlines)
        *underlines = length ? g_list_prepend(nullptr, webkit_input_method_underline_new(0, length)) : nullptr;
    if (cursor)
        *cursor = static_cast<guint>(position);
    free(string);
}

void cursor_area(WebKitInputMethodContext *engine, int x, int y, int width, int height)
{
    InputMethod *method = own(engine);
    if (!method->context || !method->view)
        return;
    int left = 0, top = 0;
    evas_object_geometry_get(method->view->image, &left, &top, nullptr, nullptr);
    ecore_imf_context_cursor_location_set(method->context, left + x, top + y, width, height);
}

void input_method_init(InputMethod *) {}

void input_method_class_init(InputMethodClass *type)
{
    type->parent.notify_focus_in = [](WebKitInputMethodContext *engine) { editing_set(engine, true); };
    type->parent.notify_focus_out = [](WebKitInputMethodContext *engine) { editing_set(engine, false); };
    type->parent.notify_cursor_area = cursor_area;
    type->parent.get_preedit = preedit_get;
    type->parent.filter_key_event = [](WebKitInputMethodContext *, GdkEventKey *) -> gboolean { return FALSE; };
    type->parent.reset = [](WebKitInputMethodContext *engine) {
        if (own(engine)->context)
            ecore_imf_context_reset(own(engine)->context);
    };
}

void committed(void *data, Ecore_IMF_Context *, void *text)
{
    const Hold hold(view_of(data));
    composing_set(*view_of(data).im, false);
    im_commit(view_of(data), static_cast<const char *>(text));
}

void preedit_changed(void *data, Ecore_IMF_Context *context, void *)
{
    const Hold hold(view_of(data));
    char *text = nullptr;
    ecore_imf_context_preedit_string_get(context, &text, nullptr);
    const bool is_composing = text && *text;
    free(text);
    if (is_composing)
        composing_set(*view_of(data).im, true);
    g_signal_emit_by_name(view_of(data).im, "preedit-changed");
    composing_set(*view_of(data).im, is_composing);
}

void delete_surrounding(void *data, Ecore_IMF_Context *, void *info)
{
    const Hold hold(view_of(data));
    const auto *event = static_cast<Ecore_IMF_Event_Delete_Surrounding *>(info);
    g_signal_emit_by_name(view_of(data).im, "delete-surrounding", event->offset, static_cast<guint>(event->n_chars));
}

constexpr std::pair<Ecore_IMF_Callback_Type, Ecore_IMF_Event_Cb> events[] = {
    {ECORE_IMF_CALLBACK_COMMIT, committed},
    {ECORE_IMF_CALLBACK_PREEDIT_CHANGED, preedit_changed},
    {ECORE_IMF_CALLBACK_DELETE_SURROUNDING, delete_surrounding},
};
} // namespace

void im_connect(View &view)
{
    view.im = static_cast<InputMethod *>(g_object_new(input_method_get_type(), nullptr));
    view.im->view = &view;
    webkit_web_view_set_input_method_context(view.page, &view.im->parent);
    g_object_unref(view.im); // the page's from here
    ecore_imf_init();
    const char *id = ecore_imf_context_default_id_get();
    Ecore_IMF_Context *context = id ? ecore_imf_context_add(id) : nullptr;
    if (!context)
        return;
    view.im->context = context;
    ecore_imf_context_client_window_set(context, reinterpret_cast<void *>(elm_win_window_id_get(view.window)));
    ecore_imf_context_client_canvas_set(context, evas_object_evas_get(view.obj));
    ecore_imf_context_use_preedit_set(context, EINA_TRUE);
    for (const auto &[type, function] : events)
        ecore_imf_context_event_callback_add(context, type, function, &view);
}

void im_disconnect(View &view)
{
    if (view.im->context) {
        for (const auto &[type, function] : events)
            ecore_imf_context_event_callback_del(view.im->context, type, function);
        ecore_imf_context_input_panel_hide(view.im->context);
        ecore_imf_context_del(view.im->context);
    }
    view.im->context = nullptr;
    view.im->view = nullptr;
    ecore_imf_shutdown();
}

void im_focus(View &view, bool)
{
    if (view.im->is_editing)
        settle(*view.im);
}

template <class Imf, class Evas_Event>
static bool filter(View &view, Ecore_IMF_Event_Type type, Evas_Event *event, void (*convert)(Evas_Event *, Imf *))
{
    if (!view.im->context || !view.im->is_editing)
        return false;
    Imf converted = {};
    convert(event, &converted);
    return ecore_imf_context_filter_event(view.im->context, type, reinterpret_cast<Ecore_IMF_Event *>(&converted));
}

bool im_filter_down(View &view, Evas_Event_Key_Down *event)
{
    return filter(view, ECORE_IMF_EVENT_KEY_DOWN, event, ecore_imf_evas_event_key_down_wrap);
}

bool im_filter_up(View &view, Evas_Event_Key_Up *event)
{
    return filter(view, ECORE_IMF_EVENT_KEY_UP, event, ecore_imf_evas_event_key_up_wrap);
}

bool im_commit(View &view, const char *text)
{
    if (!view.im->is_editing)
        return false;
    g_signal_emit_by_name(view.im, "committed", text);
    return true;
}
