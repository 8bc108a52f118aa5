// The thin half that programs link: opens the module, hands calls on.
#include "assist/assist.h"
#include "base/base.h"
#include "dlog/dlog.h"
#include "sandbox.h"
#include "table.h"
#include <chrono>
#include <dlfcn.h>
#include <thread>

namespace {
constexpr char tag[] = "WEBVIEW";

void back_key_add(Evas_Object *obj, void (*func)(void *, Evas_Object *, void *), void *data)
{
    ea_object_event_callback_add(obj, EA_CALLBACK_BACK, func, data);
}

std::string module_path()
{
    if (const char *set = std::getenv("ORVANT_WEBVIEW_MODULE"); set && *set)
        return set;
    const std::string built = platform_data_file("webview/velora-webview.so");
    return built.empty() ? WEBVIEW_MODULE_DIR "/velora-webview.so" : built;
}

// Opens the module and tries the sandbox, on a thread of its own when there is time.
struct Loader {
    std::thread thread;
    void *module = nullptr;
    std::string fault;
    bool begun = false, sandboxed = false;
    const WebviewTable *table = nullptr;

    void work()
    {
        module = dlopen(module_path().c_str(), RTLD_NOW | RTLD_LOCAL);
        if (!module)
            fault = dlerror();
        sandboxed = sandbox_works();
    }
    void begin()
    {
        if (!begun)
            thread = std::thread([this] { work(); });
        begun = true;
    }
    const WebviewTable *finish();
    ~Loader()
    {
        if (thread.joinable())
            thread.join();
    }
};
Loader loader; // the module is never closed: its toolkit cannot be

bool lacks_sandbox()
{
    const char *set = std::getenv("VELORA_WEBVIEW_SANDBOX");
    return !loader.sandboxed && !(set && std::string(set) == "off");
}

const WebviewTable *Loader::finish()
{
    if (table)
        return table;
    begin();
    if (thread.joinable())
        thread.join();
    if (!module) {
        __dlog_print(DLOG_ERROR, tag, "no web view: %s", fault.c_str());
        begun = false; // it may be there the next time
        return nullptr;
    }
    static const WebviewHost host = {__dlog_print, back_key_add, lacks_sandbox, ea_screen_reader_is_on,
                                     ea_screen_reader_read};
    const auto open = reinterpret_cast<decltype(&velora_webview_table)>(dlsym(module, "velora_webview_table"));
    table = open ? open(&host) : nullptr;
    if (!table)
        __dlog_print(DLOG_ERROR, tag, "the module is not one of this library");
    return table;
}

const WebviewTable *table()
{
    return loader.table;
}
} // namespace

Evas_Object *ewk_view_add(Evas_Object *parent)
{
    const WebviewTable *t = parent ? loader.finish() : nullptr;
    return t ? t->view_add(parent) : nullptr;
}

void ewk_prepare()
{
    loader.begin();
}

void ewk_view_base_set(Evas_Object *view, const char *base, const char *ca_file)
{
    if (view && base && table())
        table()->view_base_set(view, base, ca_file ? ca_file : "");
}

void ewk_view_patience_set(Evas_Object *view, double seconds)
{
    if (view && table())
        table()->view_patience_set(view, seconds);
}

void ewk_view_url_set(Evas_Object *view, const char *address)
{
    if (view && address && table())
        table()->view_url_set(view, address);
}

const char *ewk_view_url_get(const Evas_Object *view)
{
    return view && table() ? table()->view_url_get(view) : nullptr;
}

void ewk_view_stop(Evas_Object *view)
{
    if (view && table())
        table()->view_stop(view);
}

void ewk_view_text_zoom_set(Evas_Object *view, double zoom)
{
    if (view && table())
        table()->view_text_zoom_set(view, zoom);
}

void ewk_view_dark_set(Evas_Object *view, bool is_dark)
{
    if (view && table())
        table()->view_dark_set(view, is_dark);
}

Ewk_Context *ewk_view_context_get(const Evas_Object *view)
{
    return view && table() ? table()->view_context_get(view) : nullptr;
}

Ewk_Cookie_Manager *ewk_context_cookie_manager_get(const Ewk_Context *context)
{
    return context ? table()->cookie_manager_get(context) : nullptr;
}

void ewk_cookie_manager_cookies_clear(Ewk_Cookie_Manager *manager)
{
    if (manager)
        table()->cookies_clear(manager);
}

const char *ewk_policy_decision_url_get(const Ewk_Policy_Decision *decision)
{
    return decision ? table()->decision_url_get(decision) : nullptr;
}

void ewk_policy_decision_ignore(Ewk_Policy_Decision *decision)
{
    if (decision)
        table()->decision_set(decision, false);
}

void ewk_policy_decision_use(Ewk_Policy_Decision *decision)
{
    if (decision)
        table()->decision_set(decision, true);
}

unsigned int ewk_context_menu_item_count(const Ewk_Context_Menu *menu)
{
    return menu ? table()->menu_count(menu) : 0;
}

Ewk_Context_Menu_Item *ewk_context_menu_nth_item_get(const Ewk_Context_Menu *menu, unsigned int n)
{
    return menu ? table()->menu_nth(menu, n) : nullptr;
}

Ewk_Context_Menu_Item_Tag ewk_context_menu_item_tag_get(const Ewk_Context_Menu_Item *item)
{
    return item ? table()->menu_item_tag(item) : EWK_CONTEXT_MENU_ITEM_TAG_NO_ACTION;
}

void ewk_context_menu_item_remove(Ewk_Context_Menu *menu, Ewk_Context_Menu_Item *item)
{
    if (menu && item)
        table()->menu_item_remove(menu, item);
}
