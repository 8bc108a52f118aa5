#pragma once
// What the files of the module share. Main loop only.
#include "origin.h"
#include "table.h"
#include <Elementary.h>
#include <memory>
#include <string>
#include <vector>
#include <webkit2/webkit2.h>

struct GObjectUnref {
    void operator()(void *object) const
    {
        g_object_unref(object);
    }
};
template <class T> using Ref = std::unique_ptr<T, GObjectUnref>;

struct InputMethod;

// One view. It is freed when its Evas object is gone and nothing of ours is on the stack any more (see Hold).
struct View {
    Evas_Object *obj = nullptr;   // null once it is deleted
    Evas_Object *image = nullptr; // the page's pixels
    Evas_Object *window = nullptr;
    GtkWidget *offscreen = nullptr;
    WebKitWebView *page = nullptr; // the offscreen window's only child
    bool is_dead = false;          // "webprocess,crashed" was told
    int holds = 0;

    // policy.cpp: what may be loaded, and what is being loaded
    Origin base;
    std::string ca_file;
    std::string address;          // of the page
    std::string wanted;           // by ewk_view_url_set, until the engine asks about it
    bool is_loading = false;      // between "load,started" and "load,finished"
    bool is_base_trusted = false; // the base has shown a certificate of ca_file
    Ref<GCancellable> asking;     // the question for that certificate

    // watch.cpp
    double patience = 20;
    Ecore_Timer *watch = nullptr;
    unsigned serial = 0;     // by which an answer finds its view
    int unanswered = 0;      // ticks
    bool is_asked = false;   // a question is under way
    bool is_painted = false; // something of the page
    bool owes_frame = false; // the page is whole and nothing of it painted

    // input.cpp, im.cpp
    bool has_focus = false;
    Ecore_Job *focus_job = nullptr;
    unsigned buttons = 0;      // GDK's bits of what is pressed
    unsigned fingers = 0;      // a bit for each
    InputMethod *im = nullptr; // owned by the page

    // menu.cpp, dialog.cpp
    Evas_Object *popup = nullptr;

    // inspect.cpp
    Ecore_Timer *inspector = nullptr;
    std::string inspected;
    int fresh = 0;               // ticks for which the page still counts as new
    std::string heading, spoken; // of the page with its alerts, and the focus: read out

    double text_zoom = 1;
};

// Keeps the record of a view while a function of ours runs that may have its object deleted.
class Hold {
  public:
    explicit Hold(View &held) : view(held)
    {
        view.holds++;
    }
    ~Hold();
    Hold(const Hold &) = delete;
    Hold &operator=(const Hold &) = delete;
    // Whether the view is still there and of use.
    explicit operator bool() const
    {
        return view.obj && !view.is_dead;
    }

  private:
    View &view;
};

inline View &view_of(void *data)
{
    return *static_cast<View *>(data);
}

// module.cpp
extern const WebviewHost *host;
void log_error(const char *format, ...) __attribute__((format(printf, 1, 2)));

// engine.cpp: the toolkit and the engine, once per process.
bool engine_start();
WebKitWebView *engine_page_new(); // floating
WebKitWebContext *engine_context();
void engine_dark_set(bool is_dark);
Ewk_Context *engine_ewk_context();
Ewk_Cookie_Manager *engine_cookie_manager();
void engine_cookies_clear();
bool engine_is_clearing_cookies();

// view.cpp
Evas_Object *view_add(Evas_Object *parent);
View *view_find(const Evas_Object *obj); // null when it is none, or not any more
const std::vector<View *> &views();
void view_zoom(View &view);
void view_emit(View &view, const char *event, void *info = nullptr);
bool view_is_seen(const View &view);

// policy.cpp
void policy_connect(View &view);
void policy_load(View &view, const char *address);
void policy_load_wanted(View &view); // what waited for the cookies to go
void policy_stop(View &view);
const char *decision_url(const Ewk_Policy_Decision *decision);
void decision_set(Ewk_Policy_Decision *decision, bool used);

// input.cpp
void input_connect(View &view);
void input_disconnect(View &view);
