#include "watch.h"
#include <algorithm>
#include <cmath>

namespace {
constexpr int ticks_of_patience = 10;

void died(View &view, const char *how)
{
    if (view.is_dead)
        return;
    log_error("the web process %s", how);
    const Hold hold(view);
    view.is_dead = true;
    watch_stop(view);
    evas_object_del(view.popup);
    evas_object_smart_callback_call(view.obj, "webprocess,crashed", nullptr);
}

void answered(GObject *page, GAsyncResult *result, gpointer serial)
{
    webkit_web_view_can_execute_editing_command_finish(WEBKIT_WEB_VIEW(page), result, nullptr);
    for (View *view : views())
        if (view->serial == GPOINTER_TO_UINT(serial))
            view->is_asked = false;
}

// Counts ticks and not the time: a machine that slept has not been patient.
Eina_Bool tick(void *data)
{
    View &view = view_of(data);
    const bool is_waiting = view.is_asked || view.owes_frame;
    // A page that nobody sees need not paint, and one that has put a question to the person answers none.
    view.unanswered = is_waiting && view_is_seen(view) && !view.popup ? view.unanswered + 1 : 0;
    if (view.unanswered > ticks_of_patience) {
        view.watch = nullptr;
        webkit_web_view_terminate_web_process(view.page);
        died(view, view.is_asked ? "answers nothing" : "paints nothing");
        return ECORE_CALLBACK_CANCEL;
    }
    if (!view.is_asked) { // any question does
        view.is_asked = true;
        webkit_web_view_can_execute_editing_command(view.page, WEBKIT_EDITING_COMMAND_COPY, nullptr, answered,
                                                    GUINT_TO_POINTER(view.serial));
    }
    return ECORE_CALLBACK_RENEW;
}
} // namespace

void watch_connect(View &view)
{
    g_signal_connect(view.page, "web-process-terminated",
                     G_CALLBACK(+[](WebKitWebView *, WebKitWebProcessTerminationReason reason, gpointer data) {
                         if (reason != WEBKIT_WEB_PROCESS_TERMINATED_BY_API)
                             died(view_of(data), "has ended");
                     }),
                     &view);
}

void watch_start(View &view)
{
    watch_stop(view);
    view.watch = ecore_timer_add(view.patience / ticks_of_patience, tick, &view);
}

void watch_stop(View &view)
{
    if (view.watch)
        ecore_timer_del(view.watch);
    view.watch = nullptr;
    view.unanswered = 0;
}

void watch_painted(View &view)
{
    view.is_painted = true;
    view.owes_frame = false;
}

void watch_committed(View &view)
{
    view.is_painted = view.owes_frame = false;
}

void watch_finished(View &view)
{
    view.owes_frame = !view.is_painted;
}
