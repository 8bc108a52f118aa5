#include "fake_ewk.h"
#include <Elementary.h>
#include <algorithm>
#include <memory>
#include <utility>

struct Ewk_Cookie_Manager {};
struct Ewk_Context {
    Ewk_Cookie_Manager cookies;
};
struct Ewk_Policy_Decision {
    std::string address;
    bool is_ignored = false;
};
struct Ewk_Context_Menu_Item {
    Ewk_Context_Menu_Item_Tag tag;
};
struct Ewk_Context_Menu {
    std::vector<std::unique_ptr<Ewk_Context_Menu_Item>> items;
};

namespace {
using fake_ewk::Answer;

struct View {
    Evas_Object *obj = nullptr;               // null once it is deleted
    std::string base, address, wanted, going; // going: what is under way
    bool is_loading = false, is_dead = false;
};

std::vector<std::shared_ptr<View>> views;
std::function<Answer(const std::string &)> the_site;
fake_ewk::Seen what_was_seen;
bool is_refusing = false;
Ewk_Context context;

std::shared_ptr<View> view_of(const Evas_Object *obj)
{
    const auto found = std::ranges::find(views, obj, [](const auto &view) { return view->obj; });
    return found == views.end() ? nullptr : *found;
}

std::shared_ptr<View> last()
{
    return views.empty() ? nullptr : views.back();
}

void emit(View &view, const char *event, void *info = nullptr)
{
    if (view.obj && !view.is_dead)
        evas_object_smart_callback_call(view.obj, event, info);
}

void started(View &view)
{
    view.is_loading = true;
    emit(view, "load,started");
}

void finished(View &view)
{
    view.going.clear();
    if (std::exchange(view.is_loading, false))
        emit(view, "load,finished");
}

void failed(View &view, Ewk_Error_Type type, const std::string &address)
{
    Ewk_Error error = {type, address.c_str(), "told to fail"};
    emit(view, "load,error", &error);
    finished(view);
}

bool is_of_base(const View &view, const std::string &address)
{
    return !view.base.empty() && address.starts_with(view.base) &&
           (address.size() == view.base.size() || address[view.base.size()] == '/' || address[view.base.size()] == '?');
}

void later(const std::shared_ptr<View> &view, std::function<void(View &)> step)
{
    using Step = std::pair<std::shared_ptr<View>, std::function<void(View &)>>;
    ecore_job_add(
        [](void *data) {
            const std::unique_ptr<Step> due(static_cast<Step *>(data));
            if (due->first->obj && !due->first->is_dead)
                due->second(*due->first);
        },
        new Step(view, std::move(step)));
}

enum class By { program, person, redirect };

void go(const std::shared_ptr<View> &view, const std::string &address, By by)
{
    Ewk_Policy_Decision decision = {address};
    emit(*view, "policy,navigation,decide", &decision);
    if (!view->obj || view->is_dead)
        return;
    if (decision.is_ignored) {
        if (by == By::redirect) {
            view->is_loading = false;
            view->going.clear();
        }
        return;
    }
    if (!is_of_base(*view, address)) {
        if (by != By::person)
            failed(*view, EWK_ERROR_REFUSED, address);
        return;
    }
    if (by != By::redirect) {
        finished(*view); // what it replaces
        view->going = address;
        started(*view);
    }
    view->going = address;
    later(view, [view, address](View &one) {
        if (one.going != address)
            return;
        const Answer answer = the_site ? the_site(address) : Answer{};
        if (answer.kind == Answer::redirect)
            go(view, answer.to, By::redirect);
        else if (answer.kind == Answer::error)
            failed(one, answer.type, address);
        else if (answer.kind == Answer::page)
            fake_ewk::finish();
    });
}

void deleted(void *data, Evas *, Evas_Object *, void *)
{
    auto *view = static_cast<View *>(data);
    view->obj = nullptr;
    std::erase_if(views, [view](const auto &one) { return one.get() == view; });
}
} // namespace

namespace fake_ewk {
void clear()
{
    the_site = nullptr;
    what_was_seen = {};
    is_refusing = false;
}

void site(std::function<Answer(const std::string &address)> answer)
{
    the_site = std::move(answer);
}

void refuse_views()
{
    is_refusing = true;
}

void navigate(const std::string &address)
{
    if (const auto view = last())
        later(view, [view, address](View &) { go(view, address, By::person); });
}

void finish()
{
    const auto view = last();
    if (!view)
        return;
    view->address = view->going;
    finished(*view);
}

void fail(Ewk_Error_Type type)
{
    if (const auto view = last())
        failed(*view, type, view->going);
}

void crash()
{
    const auto view = last();
    if (!view || std::exchange(view->is_dead, true))
        return;
    evas_object_smart_callback_call(view->obj, "webprocess,crashed", nullptr);
}

void open_window(const std::string &address)
{
    if (const auto view = last())
        emit(*view, "create,window", const_cast<char *>(address.c_str()));
}

std::vector<Ewk_Context_Menu_Item_Tag> context_menu(const std::vector<Ewk_Context_Menu_Item_Tag> &tags)
{
    Ewk_Context_Menu menu;
    for (const Ewk_Context_Menu_Item_Tag tag : tags)
        menu.items.push_back(std::make_unique<Ewk_Context_Menu_Item>(tag));
    if (const auto view = last())
        emit(*view, "contextmenu,customize", &menu);
    std::vector<Ewk_Context_Menu_Item_Tag> left;
    for (const auto &item : menu.items)
        left.push_back(item->tag);
    return left;
}

const Seen &seen()
{
    return what_was_seen;
}

int live_views()
{
    return static_cast<int>(views.size());
}
} // namespace fake_ewk

Evas_Object *ewk_view_add(Evas_Object *parent)
{
    if (!parent || is_refusing)
        return nullptr;
    auto view = std::make_shared<View>();
    view->obj = elm_layout_add(parent);
    elm_object_focus_allow_set(view->obj, EINA_TRUE);
    evas_object_event_callback_add(view->obj, EVAS_CALLBACK_DEL, deleted, view.get());
    views.push_back(view);
    return view->obj;
}

void ewk_prepare()
{
    what_was_seen.prepared++;
}

void ewk_view_base_set(Evas_Object *obj, const char *base, const char *ca_file)
{
    const auto view = view_of(obj);
    if (!view || !base)
        return;
    what_was_seen.base = view->base = base;
    what_was_seen.ca_file = ca_file ? ca_file : "";
}

void ewk_view_patience_set(Evas_Object *, double seconds)
{
    what_was_seen.patience = seconds;
}

void ewk_view_url_set(Evas_Object *obj, const char *address)
{
    const auto view = view_of(obj);
    if (!view || !address)
        return;
    what_was_seen.address = address;
    later(view, [](View &one) { finished(one); }); // what is stopped
    view->wanted = address;
    later(view, [view](View &one) {
        if (const std::string wanted = std::exchange(one.wanted, ""); !wanted.empty())
            go(view, wanted, By::program);
    });
}

const char *ewk_view_url_get(const Evas_Object *obj)
{
    const auto view = view_of(obj);
    return view ? view->address.c_str() : nullptr;
}

void ewk_view_stop(Evas_Object *obj)
{
    const auto view = view_of(obj);
    if (!view)
        return;
    what_was_seen.stopped++;
    view->wanted.clear();
    later(view, [](View &one) { finished(one); });
}

void ewk_view_text_zoom_set(Evas_Object *, double zoom)
{
    what_was_seen.text_zoom = zoom;
}

void ewk_view_dark_set(Evas_Object *, bool is_dark)
{
    what_was_seen.is_dark = is_dark;
}

Ewk_Context *ewk_view_context_get(const Evas_Object *obj)
{
    return view_of(obj) ? &context : nullptr;
}

Ewk_Cookie_Manager *ewk_context_cookie_manager_get(const Ewk_Context *one)
{
    return one ? &context.cookies : nullptr;
}

void ewk_cookie_manager_cookies_clear(Ewk_Cookie_Manager *)
{
    what_was_seen.cookies_cleared++;
}

const char *ewk_policy_decision_url_get(const Ewk_Policy_Decision *decision)
{
    return decision ? decision->address.c_str() : nullptr;
}

void ewk_policy_decision_ignore(Ewk_Policy_Decision *decision)
{
    if (decision)
        decision->is_ignored = true;
}

void ewk_policy_decision_use(Ewk_Policy_Decision *decision)
{
    if (decision)
        decision->is_ignored = false;
}

unsigned int ewk_context_menu_item_count(const Ewk_Context_Menu *menu)
{
    return menu ? static_cast<unsigned int>(menu->items.size()) : 0;
}

Ewk_Context_Menu_Item *ewk_context_menu_nth_item_get(const Ewk_Context_Menu *menu, unsigned int n)
{
    return menu && n < menu->items.size() ? menu->items[n].get() : nullptr;
}

Ewk_Context_Menu_Item_Tag ewk_context_menu_item_tag_get(const Ewk_Context_Menu_Item *item)
{
    return item ? item->tag : EWK_CONTEXT_MENU_ITEM_TAG_NO_ACTION;
}

void ewk_context_menu_item_remove(Ewk_Context_Menu *menu, Ewk_Context_Menu_Item *item)
{
    if (menu)
        std::erase_if(menu->items, [item](const auto &one) { return one.get() == item; });
}
