#pragma once
// What the library and its module know of each other. The module is opened with RTLD_LOCAL and shares no static library
// with the program: what of those has a state (the log, the keys) it reaches through the host's functions.
#include "webview/ewk.h"

struct WebviewHost {
    // __dlog_print
    int (*print)(int priority, const char *tag, const char *format, ...) __attribute__((format(printf, 3, 4)));
    // Calls `func` at the back key over `obj`.
    void (*back_key_add)(Evas_Object *obj, void (*func)(void *data, Evas_Object *obj, void *), void *data);
    // $VELORA_WEBVIEW_SANDBOX is not "off", and no process could be put into a sandbox.
    bool (*lacks_sandbox)();
    // ea_screen_reader_is_on, ea_screen_reader_read
    bool (*has_reader)();
    void (*read_out)(Evas_Object *widget, const char *text);
};

// One function for each of ewk.h; those of a view, context or manager are given no null.
struct WebviewTable {
    Evas_Object *(*view_add)(Evas_Object *parent);
    void (*view_base_set)(Evas_Object *view, const char *base, const char *ca_file);
    void (*view_patience_set)(Evas_Object *view, double seconds);
    void (*view_url_set)(Evas_Object *view, const char *address);
    const char *(*view_url_get)(const Evas_Object *view);
    void (*view_stop)(Evas_Object *view);
    void (*view_text_zoom_set)(Evas_Object *view, double zoom);
    void (*view_dark_set)(Evas_Object *view, bool is_dark);
    Ewk_Context *(*view_context_get)(const Evas_Object *view);
    Ewk_Cookie_Manager *(*cookie_manager_get)(const Ewk_Context *context);
    void (*cookies_clear)(Ewk_Cookie_Manager *manager);
    const char *(*decision_url_get)(const Ewk_Policy_Decision *decision);
    void (*decision_set)(Ewk_Policy_Decision *decision, bool used);
    unsigned int (*menu_count)(const Ewk_Context_Menu *menu);
    Ewk_Context_Menu_Item *(*menu_nth)(const Ewk_Context_Menu *menu, unsigned int n);
    Ewk_Context_Menu_Item_Tag (*menu_item_tag)(const Ewk_Context_Menu_Item *item);
    void (*menu_item_remove)(Ewk_Context_Menu *menu, Ewk_Context_Menu_Item *item);
};

// The module's one symbol. `host` stays valid for ever.
extern "C" const WebviewTable *velora_webview_table(const WebviewHost *host);
