#pragma once
// A web view in an Evas canvas.
//
// The engine and its toolkit are in a module of their own, which the first view has loaded: a program that never shows
// a page is linked to neither and pays for neither.
//
// A view is an Evas object of Elementary's (it takes part in the focus, and is deleted by evas_object_del). It keeps
// nothing: no cookie, cache or history outlives the process. Pages get no camera, microphone, place, notifications,
// downloads or file choosers. JavaScript dialogs and lists of choices are the view's own popups in its window.
//
// Everything here is called, and calls back, on the main loop. Handles in event_info are the library's and valid until
// the callback returns, strings as long as what they are read from. Functions answer false, 0 or null for null
// arguments and do nothing else.
//
// Smart events of a view, in the order in which they come, event_info in parentheses. Any handler may delete the view.
//   "policy,navigation,decide" (Ewk_Policy_Decision *)  the view is about to go to an address, also by a redirect, in
//                                    its frame (others are not shown). A handler may refuse it; else it is taken when
//                                    it is allowed, see ewk_view_base_set. For an address that is neither http nor
//                                    https it comes while ewk_view_url_set runs.
//   "load,started" (null)            an allowed address begins to load; also when it turns out that nobody answers
//   there "load,error" (const Ewk_Error *) the page in the view's frame could not be loaded. The view shows nothing of
//   the
//                                    engine's own; what a person is told is the handler's concern. "load,finished"
//                                    follows when "load,started" came. An address that is not allowed is an error when
//                                    ewk_view_url_set or a redirect leads to it; a link or form that leads there has no
//                                    effect but a line in the log.
//   "load,finished" (null)           it is there, or has failed, or was stopped, or another address takes its place:
//   once
//                                    for each "load,started", but for this: of a load whose redirect a handler has
//                                    refused nothing more is heard.
//   "webprocess,crashed" (null)      the process that shows the pages has ended, or answers nothing, or has painted
//                                    nothing for the view's patience. The view is of no use any more, but for being
//                                    deleted. Comes at most once, after it no other event, "load,finished" included.
//   "create,window" (const char *address)  a page wants a new window; it gets none
//   "contextmenu,customize" (Ewk_Context_Menu *)  the menu of the right button, or of a finger held still, is about to
//                                    be shown; a handler may take items out. An empty menu is not shown. It has what a
//                                    view can do of what the engine offers: downloads are never among it.
#include <Evas.h>

struct Ewk_Context;
struct Ewk_Cookie_Manager;
struct Ewk_Policy_Decision;
struct Ewk_Context_Menu;
struct Ewk_Context_Menu_Item;

enum Ewk_Error_Type {
    EWK_ERROR_NETWORK, // the service cannot be reached, or broke off
    // its certificate is not to be trusted: nothing was sent; or it was changed in between: nothing that came is shown
    EWK_ERROR_CERTIFICATE,
    EWK_ERROR_REFUSED, // the address is not allowed
    EWK_ERROR_OTHER,
};
struct Ewk_Error {
    Ewk_Error_Type type;
    const char *address;
    const char *description; // for logs, in English
};

// The engine's numbers of what a context menu offers.
enum Ewk_Context_Menu_Item_Tag {
    EWK_CONTEXT_MENU_ITEM_TAG_NO_ACTION = 0,
    EWK_CONTEXT_MENU_ITEM_TAG_OPEN_LINK_IN_NEW_WINDOW = 1,
    EWK_CONTEXT_MENU_ITEM_TAG_DOWNLOAD_LINK_TO_DISK = 2,
    EWK_CONTEXT_MENU_ITEM_TAG_COPY_LINK_TO_CLIPBOARD = 3,
    EWK_CONTEXT_MENU_ITEM_TAG_COPY = 8,
    EWK_CONTEXT_MENU_ITEM_TAG_GO_BACK = 9,
    EWK_CONTEXT_MENU_ITEM_TAG_GO_FORWARD = 10,
    EWK_CONTEXT_MENU_ITEM_TAG_STOP = 11,
    EWK_CONTEXT_MENU_ITEM_TAG_RELOAD = 12,
    EWK_CONTEXT_MENU_ITEM_TAG_CUT = 13,
    EWK_CONTEXT_MENU_ITEM_TAG_PASTE = 14,
    EWK_CONTEXT_MENU_ITEM_TAG_SELECT_ALL = 50,
    EWK_CONTEXT_MENU_ITEM_TAG_OTHER = 84,
    EWK_CONTEXT_MENU_ITEM_TAG_SEARCH_WEB = 85,
};

// Makes a view in the window of `parent`, an Elementary widget. Null, and an error in the log, when the module or the
// engine cannot be used, for instance where no process can be put into a sandbox; $VELORA_WEBVIEW_SANDBOX=off does
// without one. The first call takes some tenths of a second: ewk_prepare() before, and a wait on screen.
Evas_Object *ewk_view_add(Evas_Object *parent);

// Has the module's files read by a thread of its own, so that the first ewk_view_add() takes less of the main loop.
// Any number of times. It also tries the sandbox there.
void ewk_prepare();

// What the view may load: addresses whose scheme, host and port are those of `base` ("https://cloud.example:8443").
// All others, and those that name a user, are refused and logged by scheme, host and port alone. What a page is made of
// comes from its own origin, or not. A view without a base loads nothing. `ca_file`: certificates in PEM to trust
// instead of the system's for this base; null or "" for the system's.
void ewk_view_base_set(Evas_Object *view, const char *base, const char *ca_file);
// How long, in seconds, a page may leave the view unpainted, or the engine a question unanswered, before
// "webprocess,crashed"; 20 at first. Only while somebody can see the view, and not while a question of the page's
// script waits for the person. A service that takes its time is not the engine's fault.
void ewk_view_patience_set(Evas_Object *view, double seconds);

// Loads an address; what was being loaded is stopped.
void ewk_view_url_set(Evas_Object *view, const char *address);
// The address of the page; "" when there is none. Valid until the next page.
const char *ewk_view_url_get(const Evas_Object *view);
// Ends loading, without an error.
void ewk_view_stop(Evas_Object *view);
// How much larger than in its design the page's text is; 1 at first. By itself a page of 16 pixels has the size of the
// program's text: 480 pixels at the scale 1.8 are 360 of CSS.
void ewk_view_text_zoom_set(Evas_Object *view, double zoom);
// Whether pages are told that the person prefers dark ones (prefers-color-scheme); for all views of the process.
void ewk_view_dark_set(Evas_Object *view, bool is_dark);

Ewk_Context *ewk_view_context_get(const Evas_Object *view);
Ewk_Cookie_Manager *ewk_context_cookie_manager_get(const Ewk_Context *context);
// Addresses that are loaded later see no cookie that was there before.
void ewk_cookie_manager_cookies_clear(Ewk_Cookie_Manager *manager);

const char *ewk_policy_decision_url_get(const Ewk_Policy_Decision *decision);
// The view stays where it is: there is neither "load,started" nor an error.
void ewk_policy_decision_ignore(Ewk_Policy_Decision *decision);
void ewk_policy_decision_use(Ewk_Policy_Decision *decision);

unsigned int ewk_context_menu_item_count(const Ewk_Context_Menu *menu);
// Null beyond the last one.
Ewk_Context_Menu_Item *ewk_context_menu_nth_item_get(const Ewk_Context_Menu *menu, unsigned int n);
Ewk_Context_Menu_Item_Tag ewk_context_menu_item_tag_get(const Ewk_Context_Menu_Item *item);
// The item is no more afterwards.
void ewk_context_menu_item_remove(Ewk_Context_Menu *menu, Ewk_Context_Menu_Item *item);
