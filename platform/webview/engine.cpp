// The toolkit and the engine: what a process has one of.
#include "view.h"
#include <X11/Xlib.h>
#include <algorithm>
#include <csignal>
#include <gtk/gtk.h>

struct Ewk_Cookie_Manager {};
struct Ewk_Context {
    Ewk_Cookie_Manager cookies;
};

namespace {
WebKitWebContext *context = nullptr;
int clearing = 0; // requests to forget cookies that are under way

// For the time of one call. What the program starts later does not get it.
class Variable {
  public:
    Variable(const char *its_name, const std::string &value) : name(its_name), is_ours(!g_getenv(its_name))
    {
        if (is_ours)
            g_setenv(name, value.c_str(), TRUE);
    }
    ~Variable()
    {
        if (is_ours)
            g_unsetenv(name);
    }
    Variable(const Variable &) = delete;
    Variable &operator=(const Variable &) = delete;

  private:
    const char *name;
    bool is_ours;
};

// An error is the end of a request, not of the program.
int note_error(Display *, XErrorEvent *error)
{
    host->print(4, "WEBVIEW", "X error %d of request %d.%d", error->error_code, error->request_code, error->minor_code);
    return 0;
}

bool toolkit_start()
{
    const Variable no_bridge("NO_AT_BRIDGE", "1"); // Elementary speaks to screen readers, and inspect.cpp for the page
    // GDK's handlers end the process at an error; Ecore's know that windows come and go.
    const auto on_error = XSetErrorHandler(nullptr);
    const auto on_io_error = XSetIOErrorHandler(nullptr);
    const auto fatal = XSetErrorHandler(on_error); // what is left when nobody handles them
    XSetIOErrorHandler(on_io_error);
    gtk_disable_setlocale(); // the program has done it
    gdk_set_allowed_backends("x11,wayland");
    const bool started = gtk_init_check(nullptr, nullptr);
    XSetErrorHandler(on_error == fatal ? note_error : on_error);
    XSetIOErrorHandler(on_io_error);
    if (!started)
        return false;
    // Sizes are the view's affair (view_zoom), not the desktop's.
    g_object_set(gtk_settings_get_default(), "gtk-xft-dpi", 96 * 1024, nullptr);
    return true;
}

// "de_AT:de" as the engine wants it: {"de-AT", "de"}.
void languages_set()
{
    std::vector<std::string> texts;
    for (const char *const *name = g_get_language_names(); *name; name++)
        if (std::string text = *name; text != "C" && text.find_first_of(".@") == std::string::npos) {
            std::replace(text.begin(), text.end(), '_', '-');
            texts.push_back(text);
        }
    std::vector<const char *> names;
    for (const std::string &text : texts)
        names.push_back(text.c_str());
    names.push_back(nullptr);
    if (names.size() > 1)
        webkit_web_context_set_preferred_languages(context, names.data());
}

void context_start()
{
    // SIGUSR1, the engine's own choice, is Ecore's.
    const Variable signal("JSC_SIGNAL_FOR_GC", std::to_string(SIGRTMIN + 5));
    const Ref<WebKitWebsiteDataManager> data(webkit_website_data_manager_new_ephemeral());
    context = webkit_web_context_new_with_website_data_manager(data.get());
    webkit_website_data_manager_set_tls_errors_policy(data.get(), WEBKIT_TLS_ERRORS_POLICY_FAIL);
    webkit_web_context_set_cache_model(context, WEBKIT_CACHE_MODEL_DOCUMENT_VIEWER);
    webkit_web_context_set_sandbox_enabled(context, g_strcmp0(g_getenv("VELORA_WEBVIEW_SANDBOX"), "off") != 0);
    webkit_web_context_set_use_system_appearance_for_scrollbars(context, FALSE);
    webkit_web_context_set_spell_checking_enabled(context, FALSE);
    webkit_cookie_manager_set_accept_policy(webkit_web_context_get_cookie_manager(context),
                                            WEBKIT_COOKIE_POLICY_ACCEPT_NO_THIRD_PARTY);
    languages_set();
    g_signal_connect(
        context, "download-started",
        G_CALLBACK(+[](WebKitWebContext *, WebKitDownload *download, gpointer) { webkit_download_cancel(download); }),
        nullptr);
}

WebKitSettings *settings_new()
{
    WebKitSettings *settings = webkit_settings_new();
    webkit_settings_set_hardware_acceleration_policy(settings, WEBKIT_HARDWARE_ACCELERATION_POLICY_NEVER);
    for (const auto set : {
             webkit_settings_set_enable_webgl,
             webkit_settings_set_enable_media,
             webkit_settings_set_enable_media_stream,
             webkit_settings_set_enable_mediasource,
             webkit_settings_set_enable_webaudio,
             webkit_settings_set_enable_webrtc,
             webkit_settings_set_enable_encrypted_media,
             webkit_settings_set_enable_fullscreen,
             webkit_settings_set_enable_html5_database,
             webkit_settings_set_enable_page_cache,
             webkit_settings_set_enable_dns_prefetching,
             webkit_settings_set_enable_developer_extras,
             webkit_settings_set_enable_smooth_scrolling,
             webkit_settings_set_enable_back_forward_navigation_gestures,
             webkit_settings_set_javascript_can_open_windows_automatically,
         })
        set(settings, FALSE);
    // Lists of GTK's own windows, and connections to addresses that the policy has not seen.
    WebKitFeatureList *features = webkit_settings_get_all_features();
    for (gsize i = 0; i < webkit_feature_list_get_length(features); i++) {
        WebKitFeature *feature = webkit_feature_list_get(features, i);
        for (const char *name : {"DataListElementEnabled", "LinkPreconnectEnabled", "LinkPrefetchEnabled"})
            if (g_str_equal(webkit_feature_get_identifier(feature), name))
                webkit_settings_set_feature_enabled(settings, feature, FALSE);
    }
    webkit_feature_list_unref(features);
    return settings;
}
} // namespace

bool engine_start()
{
    if (context)
        return true;
    if (host->lacks_sandbox()) {
        log_error(
            "no web view: bubblewrap cannot put a process into a sandbox here, or it or xdg-dbus-proxy is missing; "
            "VELORA_WEBVIEW_SANDBOX=off does without");
        return false;
    }
    if (!toolkit_start()) {
        log_error("no web view: the toolkit has no display");
        return false;
    }
    context_start();
    return true;
}

WebKitWebView *engine_page_new()
{
    const Ref<WebKitSettings> settings(settings_new());
    // The page's own address is of the base; so all that it asks for is.
    return WEBKIT_WEB_VIEW(g_object_new(
        WEBKIT_TYPE_WEB_VIEW, "web-context", context, "settings", settings.get(), "default-content-security-policy",
        "default-src 'self' data: 'unsafe-inline' 'unsafe-eval'; frame-src 'none'; object-src 'none'", nullptr));
}

WebKitWebContext *engine_context()
{
    return context;
}

void engine_dark_set(bool is_dark)
{
    g_object_set(gtk_settings_get_default(), "gtk-application-prefer-dark-theme", is_dark, nullptr);
    const GdkRGBA paper = is_dark ? GdkRGBA{0.07, 0.07, 0.07, 1} : GdkRGBA{1, 1, 1, 1};
    for (const View *view : views())
        webkit_web_view_set_background_color(view->page, &paper);
}

Ewk_Context *engine_ewk_context()
{
    static Ewk_Context the_one;
    return &the_one;
}

Ewk_Cookie_Manager *engine_cookie_manager()
{
    return &engine_ewk_context()->cookies;
}

void engine_cookies_clear()
{
    clearing++;
    webkit_website_data_manager_clear(
        webkit_web_context_get_website_data_manager(context), WEBKIT_WEBSITE_DATA_COOKIES, 0, nullptr,
        [](GObject *manager, GAsyncResult *result, gpointer) {
            webkit_website_data_manager_clear_finish(WEBKIT_WEBSITE_DATA_MANAGER(manager), result, nullptr);
            clearing--;
            const std::vector<View *> waiting = views();
            for (View *view : waiting)
                policy_load_wanted(*view);
        },
        nullptr);
}

bool engine_is_clearing_cookies()
{
    return clearing > 0;
}
