#include "inspect.h"
#include <algorithm>
#include <cstdlib>

// Lines of kind, text, x, y, width and height, in parts of the view's width: what is in sight, and alerts wherever they
// are. Fields go by their labels, what has the focus comes last once more.
static constexpr char script[] = R"js((function () {
    const lines = [], text = node => (node.innerText || "").trim().replace(/\s+/g, " ");
    const name = node => node.labels && node.labels.length ? text(node.labels[0])
        : text(node) || node.getAttribute("aria-label") || (node.type === "submit" && node.value) || "";
    const add = (kind, node) => {
        const box = node.getBoundingClientRect();
        if (name(node) && box.width > 1 && box.height > 1 && (kind === "page:alert" || kind === "page:heading" || (box.bottom > 0 && box.top < innerHeight)))
            lines.push([kind, name(node), ...[box.left, box.top, box.width, box.height].map(n => n / innerWidth)].join("\t"));
    };
    const all = (kind, nodes) => document.querySelectorAll(nodes).forEach(node => add(kind, node));
    all("page:heading", "h1");
    all("page:text", "h1, h2, p, li, dt, dd, label");
    all("page:alert", "[role=alert]");
    all("page:link", "a[href]");
    all("page:button", "button, input[type=submit]");
    all("page:field", "input:not([type=hidden]):not([type=submit]), select");
    if (document.hasFocus() && document.activeElement !== document.body)
        add("page:focus", document.activeElement);
    return lines.join("\n");
})())js";
static constexpr double period = 0.2; // seconds
static constexpr int ticks_fresh = 5;

static std::string in_pixels(const char *list, int width)
{
    std::string all;
    char **lines = g_strsplit(list, "\n", -1);
    for (char **line = lines; *line; line++) {
        char **fields = g_strsplit(*line, "\t", -1);
        if (g_strv_length(fields) == 6) {
            all += std::string(fields[0]) + "\t" + fields[1];
            for (int i = 2; i < 6; i++)
                all += "\t" + std::to_string(static_cast<int>(g_ascii_strtod(fields[i], nullptr) * width));
            all += "\n";
        }
        g_strfreev(fields);
    }
    g_strfreev(lines);
    return all;
}

// The text of the first line of a kind, or of all of them.
static std::string text_of(const std::string &list, const std::string &kind, bool all = false)
{
    std::string texts;
    for (size_t at = 0; at < list.size() && (all || texts.empty());) {
        const size_t end = std::min(list.find('\n', at), list.size());
        const size_t tab = list.find('\t', at);
        if (tab < end && list.compare(at, tab - at, kind) == 0)
            texts += (texts.empty() ? "" : " ") + list.substr(tab + 1, list.find('\t', tab + 1) - tab - 1);
        at = end + 1;
    }
    return texts;
}

// The engine's own accessibility needs a toolkit's window on the screen, which this view is not. A screen reader is
// told what a page is called, what went wrong on it, and what has the focus.
static void read_out(View &view)
{
    const std::string heading = text_of(view.inspected, "page:heading");
    const std::string alerts = text_of(view.inspected, "page:alert", true);
    const std::string focus = text_of(view.inspected, "page:focus");
    const std::string page = heading + " " + alerts;
    if (page != view.heading)
        view.fresh = ticks_fresh;
    else if (view.fresh > 0)
        view.fresh--;
    if (page == view.heading && focus == view.spoken)
        return;
    view.heading = page;
    view.spoken = focus;
    // A focus that a page gives as it comes must not cut its name short.
    const std::string words = view.fresh > 0 ? page + " " + focus : focus;
    if (words.empty())
        return;
    host->read_out(view.obj, words.c_str());
}

static void listed(GObject *page, GAsyncResult *result, gpointer serial)
{
    JSCValue *value = webkit_web_view_evaluate_javascript_finish(WEBKIT_WEB_VIEW(page), result, nullptr);
    char *list = value ? jsc_value_to_string(value) : nullptr;
    for (View *view : views()) {
        if (view->serial != GPOINTER_TO_UINT(serial) || !list)
            continue;
        int width = 0;
        evas_object_geometry_get(view->image, nullptr, nullptr, &width, nullptr);
        view->inspected = in_pixels(list, width);
        evas_object_data_set(view->obj, "inspect,list", view->inspected.c_str());
        if (host->has_reader())
            read_out(*view);
    }
    g_free(list);
    if (value)
        g_object_unref(value);
}

static Eina_Bool look(void *data)
{
    View &view = view_of(data);
    if (!view.is_dead) // in a world of its own: pages see nothing of it
        webkit_web_view_evaluate_javascript(view.page, script, -1, "inspect", nullptr, nullptr, listed,
                                            GUINT_TO_POINTER(view.serial));
    return ECORE_CALLBACK_RENEW;
}

void inspect_start(View &view)
{
    if (std::getenv("ORVANT_INSPECT") || host->has_reader())
        view.inspector = ecore_timer_add(period, look, &view);
}

void inspect_stop(View &view)
{
    if (view.inspector)
        ecore_timer_del(view.inspector);
    view.inspector = nullptr;
}
