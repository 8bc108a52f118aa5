// The module's face: the table of its functions.
#include "menu.h"
#include "view.h"
#include "watch.h"
#include <cstdarg>

const WebviewHost *host = nullptr;

void log_error(const char *format, ...)
{
    va_list arguments;
    va_start(arguments, format);
    char *text = g_strdup_vprintf(format, arguments);
    va_end(arguments);
    host->print(6, "WEBVIEW", "%s", text); // DLOG_ERROR
    g_free(text);
}

static void base_set(Evas_Object *obj, const char *base, const char *ca_file)
{
    View *view = view_find(obj);
    if (!view)
        return;
    view->base = origin_of(base);
    view->ca_file = ca_file;
    view->is_base_trusted = false;
    if (!view->base)
        log_error("no base of a web view: %s", base);
}

static void patience_set(Evas_Object *obj, double seconds)
{
    View *view = view_find(obj);
    if (!view || seconds <= 0)
        return;
    view->patience = seconds;
    if (view->watch)
        watch_start(*view);
}

static void url_set(Evas_Object *obj, const char *address)
{
    if (View *view = view_find(obj))
        policy_load(*view, address);
}

static const char *url_get(const Evas_Object *obj)
{
    const View *view = view_find(obj);
    return view ? view->address.c_str() : nullptr;
}

static void stop(Evas_Object *obj)
{
    if (View *view = view_find(obj))
        policy_stop(*view);
}

static void text_zoom_set(Evas_Object *obj, double zoom)
{
    View *view = view_find(obj);
    if (!view || zoom <= 0)
        return;
    view->text_zoom = zoom;
    view_zoom(*view);
}

static void dark_set(Evas_Object *obj, bool is_dark)
{
    if (view_find(obj))
        engine_dark_set(is_dark);
}

static Ewk_Context *context_get(const Evas_Object *obj)
{
    return view_find(obj) ? engine_ewk_context() : nullptr;
}

extern "C" __attribute__((visibility("default"))) const WebviewTable *velora_webview_table(const WebviewHost *the_host)
{
    host = the_host;
    static const WebviewTable table = {
        .view_add = view_add,
        .view_base_set = base_set,
        .view_patience_set = patience_set,
        .view_url_set = url_set,
        .view_url_get = url_get,
        .view_stop = stop,
        .view_text_zoom_set = text_zoom_set,
        .view_dark_set = dark_set,
        .view_context_get = context_get,
        .cookie_manager_get = [](const Ewk_Context *) { return engine_cookie_manager(); },
        .cookies_clear = [](Ewk_Cookie_Manager *) { engine_cookies_clear(); },
        .decision_url_get = decision_url,
        .decision_set = decision_set,
        .menu_count = menu_count,
        .menu_nth = menu_nth,
        .menu_item_tag = menu_item_tag,
        .menu_item_remove = menu_item_remove,
    };
    return &table;
}
