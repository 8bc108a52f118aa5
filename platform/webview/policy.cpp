// Where a view may go, and what is told of its way there.
#include "menu.h"
#include "trust.h"
#include "watch.h"
#include <utility>

struct Ewk_Policy_Decision {
    std::string url;
    bool is_ignored = false;
};

namespace {
constexpr char refused_text[] = "not an address of the base";

void emit_error(View &view, Ewk_Error_Type type, const char *address, const char *description)
{
    Ewk_Error error = {type, address, description};
    view_emit(view, "load,error", &error);
}

void emit_started(View &view)
{
    view.is_loading = true;
    view_emit(view, "load,started");
}

void emit_finished(View &view)
{
    if (std::exchange(view.is_loading, false))
        view_emit(view, "load,finished");
}

// The engine's own empty page.
bool is_blank(const char *address)
{
    return g_str_has_prefix(address, "about:");
}

void fail(View &view, Ewk_Error_Type type, const std::string &address, const std::string &description)
{
    emit_error(view, type, address.c_str(), description.c_str());
    emit_finished(view);
}

struct Question {
    View *view;
    Ref<WebKitPolicyDecision> decision;
    std::string address;
};

// The base has shown its certificate, or not.
void base_answered(Trust trust, GTlsCertificate *certificate, const char *text, void *data)
{
    const std::unique_ptr<Question> question(static_cast<Question *>(data));
    if (trust == Trust::cancelled) {
        webkit_policy_decision_ignore(question->decision.get());
        return;
    }
    View &view = *question->view;
    const Hold hold(view);
    view.asking.reset();
    if (trust == Trust::good) {
        view.is_base_trusted = true;
        webkit_web_context_allow_tls_certificate_for_host(engine_context(), certificate, view.base.host.c_str());
        webkit_policy_decision_use(question->decision.get());
        return;
    }
    webkit_policy_decision_ignore(question->decision.get());
    if (!view.is_loading)
        emit_started(view);
    fail(view, trust == Trust::bad ? EWK_ERROR_CERTIFICATE : EWK_ERROR_NETWORK, question->address, text);
}

enum class Verdict { allowed, ignored, refused };

// The handler's word first, as it may wait for an address that is not of the base; then the base's.
Verdict judge(View &view, const Hold &hold, const std::string &url)
{
    Ewk_Policy_Decision asked = {url};
    view_emit(view, "policy,navigation,decide", &asked);
    if (!hold || asked.is_ignored)
        return Verdict::ignored;
    const Origin origin = origin_of(url);
    if (origin && origin == view.base)
        return Verdict::allowed;
    log_error("refused: %s is not of the base %s", origin.text().c_str(), view.base.text().c_str());
    return Verdict::refused;
}

void decide_navigation(View &view, WebKitPolicyDecision *decision)
{
    WebKitNavigationAction *action =
        webkit_navigation_policy_decision_get_navigation_action(WEBKIT_NAVIGATION_POLICY_DECISION(decision));
    const std::string url = webkit_uri_request_get_uri(webkit_navigation_action_get_request(action));
    if (is_blank(url.c_str())) {
        webkit_policy_decision_use(decision);
        return;
    }
    const Hold hold(view);
    const bool is_redirect = webkit_navigation_action_is_redirect(action);
    const bool is_wanted = !std::exchange(view.wanted, "").empty();
    const Verdict verdict = judge(view, hold, url);
    if (verdict == Verdict::allowed && view.base.scheme == "https" && !view.ca_file.empty() && !view.is_base_trusted) {
        view.asking.reset(g_cancellable_new());
        auto *kept = WEBKIT_POLICY_DECISION(g_object_ref(decision));
        trust_ask(view.base, view.ca_file, view.asking.get(), base_answered,
                  new Question{&view, Ref<WebKitPolicyDecision>(kept), url});
        return;
    }
    if (verdict == Verdict::allowed) {
        webkit_policy_decision_use(decision);
        return;
    }
    if (verdict == Verdict::ignored && is_redirect)
        view.is_loading = false; // nothing more is heard of this load
    webkit_policy_decision_ignore(decision);
    // what a person does on a page just has no effect
    if (verdict == Verdict::refused && (is_wanted || is_redirect))
        fail(view, EWK_ERROR_REFUSED, url, refused_text);
}

gboolean decide(WebKitWebView *, WebKitPolicyDecision *decision, WebKitPolicyDecisionType type, gpointer data)
{
    View &view = view_of(data);
    if (type == WEBKIT_POLICY_DECISION_TYPE_RESPONSE) {
        auto *response = WEBKIT_RESPONSE_POLICY_DECISION(decision);
        if (webkit_response_policy_decision_is_mime_type_supported(response))
            return FALSE;
        const Hold hold(view);
        const std::string url = webkit_uri_request_get_uri(webkit_response_policy_decision_get_request(response));
        webkit_policy_decision_ignore(decision); // no downloads
        if (view.is_loading)
            emit_error(view, EWK_ERROR_OTHER, url.c_str(), "not a page");
        return TRUE;
    }
    if (type == WEBKIT_POLICY_DECISION_TYPE_NAVIGATION_ACTION) {
        decide_navigation(view, decision);
        return TRUE;
    }
    const Hold hold(view);
    WebKitNavigationAction *action =
        webkit_navigation_policy_decision_get_navigation_action(WEBKIT_NAVIGATION_POLICY_DECISION(decision));
    const std::string url = webkit_uri_request_get_uri(webkit_navigation_action_get_request(action));
    webkit_policy_decision_ignore(decision);
    view_emit(view, "create,window", const_cast<char *>(url.c_str()));
    return TRUE;
}

GtkWidget *create(WebKitWebView *, WebKitNavigationAction *action, gpointer data)
{
    View &view = view_of(data);
    const Hold hold(view);
    const std::string url = webkit_uri_request_get_uri(webkit_navigation_action_get_request(action));
    view_emit(view, "create,window", const_cast<char *>(url.c_str()));
    return nullptr;
}

// The certificate by which the page that is there now came.
bool came_trusted(const View &view)
{
    GTlsCertificate *certificate = nullptr;
    GTlsCertificateFlags errors = {};
    if (view.base.scheme != "https" || !webkit_web_view_get_tls_info(view.page, &certificate, &errors))
        return view.base.scheme != "https";
    return view.ca_file.empty() ? errors == 0 : trust_check(certificate, view.base, view.ca_file);
}

void load_changed(WebKitWebView *page, WebKitLoadEvent event, gpointer data)
{
    View &view = view_of(data);
    const Hold hold(view);
    const char *uri = webkit_web_view_get_uri(page);
    const bool blank = !uri || is_blank(uri);
    if (event == WEBKIT_LOAD_STARTED && !blank) {
        emit_finished(view); // of what it replaces
        if (hold)
            emit_started(view);
    } else if (event == WEBKIT_LOAD_COMMITTED) {
        view.address = blank ? "" : uri;
        if (blank)
            return;
        watch_committed(view);
        if (came_trusted(view))
            return;
        // Nobody sees it: what the base shows on one connection it may not show on the next.
        webkit_web_view_load_uri(page, "about:blank");
        fail(view, EWK_ERROR_CERTIFICATE, uri, "the page came with another certificate");
    } else if (event == WEBKIT_LOAD_FINISHED) {
        watch_finished(view);
        emit_finished(view);
    }
}

gboolean load_failed(WebKitWebView *, WebKitLoadEvent, const char *address, GError *error, gpointer data)
{
    View &view = view_of(data);
    const Hold hold(view);
    const bool is_ended =
        g_error_matches(error, WEBKIT_NETWORK_ERROR, WEBKIT_NETWORK_ERROR_CANCELLED) ||
        g_error_matches(error, WEBKIT_POLICY_ERROR, WEBKIT_POLICY_ERROR_FRAME_LOAD_INTERRUPTED_BY_POLICY_CHANGE);
    if (!is_ended && view.is_loading)
        emit_error(view, error->domain == WEBKIT_POLICY_ERROR ? EWK_ERROR_OTHER : EWK_ERROR_NETWORK, address,
                   error->message);
    return TRUE; // no page of the engine's own about it
}

gboolean tls_failed(WebKitWebView *, const char *address, GTlsCertificate *, GTlsCertificateFlags, gpointer data)
{
    View &view = view_of(data);
    const Hold hold(view);
    emit_error(view, EWK_ERROR_CERTIFICATE, address, "its certificate is not to be trusted");
    return TRUE;
}
} // namespace

const char *decision_url(const Ewk_Policy_Decision *decision)
{
    return decision->url.c_str();
}

void decision_set(Ewk_Policy_Decision *decision, bool used)
{
    decision->is_ignored = !used;
}

void policy_connect(View &view)
{
    g_signal_connect(view.page, "decide-policy", G_CALLBACK(decide), &view);
    g_signal_connect(view.page, "create", G_CALLBACK(create), &view);
    g_signal_connect(view.page, "load-changed", G_CALLBACK(load_changed), &view);
    g_signal_connect(view.page, "load-failed", G_CALLBACK(load_failed), &view);
    g_signal_connect(view.page, "load-failed-with-tls-errors", G_CALLBACK(tls_failed), &view);
}

void policy_load(View &view, const char *address)
{
    if (view.is_dead)
        return;
    policy_stop(view);
    view.wanted = address;
    if (origin_of(address)) {
        policy_load_wanted(view);
        return;
    }
    // The engine would run it, or have its own ideas of what it means.
    const Hold hold(view);
    view.wanted.clear();
    if (judge(view, hold, address) == Verdict::refused)
        fail(view, EWK_ERROR_REFUSED, address, refused_text);
}

void policy_load_wanted(View &view)
{
    if (view.wanted.empty() || engine_is_clearing_cookies() || view.is_dead)
        return;
    if (!view.watch)
        watch_start(view);
    webkit_web_view_load_uri(view.page, view.wanted.c_str());
}

void policy_stop(View &view)
{
    view.wanted.clear();
    if (view.asking)
        g_cancellable_cancel(view.asking.get());
    view.asking.reset();
    if (!view.is_dead)
        webkit_web_view_stop_loading(view.page);
}
