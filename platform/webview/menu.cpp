#include "menu.h"
#include <algorithm>
#include <gtk/gtk.h>

struct Ewk_Context_Menu_Item {
    Ewk_Context_Menu_Item_Tag tag;
    WebKitContextMenuAction action;
    std::string label;
};
struct Ewk_Context_Menu {
    std::vector<std::unique_ptr<Ewk_Context_Menu_Item>> items;
    std::string link;
    View *view;
};

namespace {
// What a view can do of what the engine offers, and the numbers that handlers know it by.
constexpr std::pair<WebKitContextMenuAction, Ewk_Context_Menu_Item_Tag> tags[] = {
    {WEBKIT_CONTEXT_MENU_ACTION_OPEN_LINK, EWK_CONTEXT_MENU_ITEM_TAG_OTHER},
    {WEBKIT_CONTEXT_MENU_ACTION_OPEN_LINK_IN_NEW_WINDOW, EWK_CONTEXT_MENU_ITEM_TAG_OPEN_LINK_IN_NEW_WINDOW},
    {WEBKIT_CONTEXT_MENU_ACTION_COPY_LINK_TO_CLIPBOARD, EWK_CONTEXT_MENU_ITEM_TAG_COPY_LINK_TO_CLIPBOARD},
    {WEBKIT_CONTEXT_MENU_ACTION_COPY, EWK_CONTEXT_MENU_ITEM_TAG_COPY},
    {WEBKIT_CONTEXT_MENU_ACTION_CUT, EWK_CONTEXT_MENU_ITEM_TAG_CUT},
    {WEBKIT_CONTEXT_MENU_ACTION_PASTE, EWK_CONTEXT_MENU_ITEM_TAG_PASTE},
    {WEBKIT_CONTEXT_MENU_ACTION_SELECT_ALL, EWK_CONTEXT_MENU_ITEM_TAG_SELECT_ALL},
    {WEBKIT_CONTEXT_MENU_ACTION_GO_BACK, EWK_CONTEXT_MENU_ITEM_TAG_GO_BACK},
    {WEBKIT_CONTEXT_MENU_ACTION_GO_FORWARD, EWK_CONTEXT_MENU_ITEM_TAG_GO_FORWARD},
    {WEBKIT_CONTEXT_MENU_ACTION_STOP, EWK_CONTEXT_MENU_ITEM_TAG_STOP},
    {WEBKIT_CONTEXT_MENU_ACTION_RELOAD, EWK_CONTEXT_MENU_ITEM_TAG_RELOAD},
};

// The engine's own words, without the mark of the mnemonic.
std::string label_of(GtkAction *action)
{
    std::string label = gtk_action_get_label(action) ? gtk_action_get_label(action) : "";
    std::erase(label, '_');
    return label;
}

void perform(View &view, WebKitContextMenuAction action, std::string link)
{
    switch (action) {
    case WEBKIT_CONTEXT_MENU_ACTION_OPEN_LINK:
        webkit_web_view_load_uri(view.page, link.c_str());
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_OPEN_LINK_IN_NEW_WINDOW:
        view_emit(view, "create,window", link.data());
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_COPY_LINK_TO_CLIPBOARD:
        gtk_clipboard_set_text(gtk_clipboard_get(GDK_SELECTION_CLIPBOARD), link.c_str(), -1);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_COPY:
        webkit_web_view_execute_editing_command(view.page, WEBKIT_EDITING_COMMAND_COPY);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_CUT:
        webkit_web_view_execute_editing_command(view.page, WEBKIT_EDITING_COMMAND_CUT);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_PASTE:
        webkit_web_view_execute_editing_command(view.page, WEBKIT_EDITING_COMMAND_PASTE);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_SELECT_ALL:
        webkit_web_view_execute_editing_command(view.page, WEBKIT_EDITING_COMMAND_SELECT_ALL);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_GO_BACK:
        webkit_web_view_go_back(view.page);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_GO_FORWARD:
        webkit_web_view_go_forward(view.page);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_STOP:
        webkit_web_view_stop_loading(view.page);
        break;
    case WEBKIT_CONTEXT_MENU_ACTION_RELOAD:
        webkit_web_view_reload(view.page);
        break;
    default:
        break;
    }
}

void chosen(void *data, Evas_Object *popup, void *item)
{
    const auto *menu = static_cast<Ewk_Context_Menu *>(data);
    const auto *chosen_one =
        static_cast<const Ewk_Context_Menu_Item *>(elm_object_item_data_get(static_cast<Elm_Object_Item *>(item)));
    View &view = *menu->view;
    const Hold hold(view);
    popup_close_soon(popup);
    perform(view, chosen_one->action, menu->link);
}

void show(View &view, std::unique_ptr<Ewk_Context_Menu> owned, int x, int y)
{
    Ewk_Context_Menu *menu = owned.release();
    Evas_Object *popup = ctxpopup_new(view, x, y);
    for (const auto &item : menu->items) {
        Elm_Object_Item *row =
            elm_ctxpopup_item_append(popup, markup_of(item->label.c_str()).c_str(), nullptr, chosen, menu);
        elm_object_item_data_set(row, item.get());
    }
    popup_set(view, popup, [menu] { delete menu; });
}

gboolean context_menu(WebKitWebView *, WebKitContextMenu *offered, GdkEvent *event, WebKitHitTestResult *hit,
                      gpointer data)
{
    View &view = view_of(data);
    const Hold hold(view);
    auto menu = std::make_unique<Ewk_Context_Menu>();
    menu->view = &view;
    if (const char *link = webkit_hit_test_result_get_link_uri(hit))
        menu->link = link;
    for (GList *item = webkit_context_menu_get_items(offered); item; item = item->next) {
        auto *one = WEBKIT_CONTEXT_MENU_ITEM(item->data);
        GtkAction *action = webkit_context_menu_item_get_action(one);
        const auto known = std::ranges::find(tags, webkit_context_menu_item_get_stock_action(one),
                                             &std::pair<WebKitContextMenuAction, Ewk_Context_Menu_Item_Tag>::first);
        if (known != std::end(tags) && action && gtk_action_get_sensitive(action))
            menu->items.push_back(
                std::make_unique<Ewk_Context_Menu_Item>(known->second, known->first, label_of(action)));
    }
    view_emit(view, "contextmenu,customize", menu.get());
    double x = 0, y = 0;
    if (event)
        gdk_event_get_coords(event, &x, &y);
    if (hold && !menu->items.empty())
        show(view, std::move(menu), static_cast<int>(x), static_cast<int>(y));
    return TRUE;
}
} // namespace

void menu_connect(View &view)
{
    g_signal_connect(view.page, "context-menu", G_CALLBACK(context_menu), &view);
}

unsigned int menu_count(const Ewk_Context_Menu *menu)
{
    return static_cast<unsigned int>(menu->items.size());
}

Ewk_Context_Menu_Item *menu_nth(const Ewk_Context_Menu *menu, unsigned int n)
{
    return n < menu->items.size() ? menu->items[n].get() : nullptr;
}

Ewk_Context_Menu_Item_Tag menu_item_tag(const Ewk_Context_Menu_Item *item)
{
    return item->tag;
}

void menu_item_remove(Ewk_Context_Menu *menu, Ewk_Context_Menu_Item *item)
{
    std::erase_if(menu->items, [item](const auto &one) { return one.get() == item; });
}
