// A view's life, size and painting.
#include "inspect.h"
#include "menu.h"
#include "watch.h"
#include <algorithm>
#include <cairo.h>
#include <gtk/gtk.h>

namespace {
std::vector<View *> all;

void paper_paint(View &view)
{
    int width = 0, height = 0;
    evas_object_image_size_get(view.image, &width, &height);
    void *pixels = evas_object_image_data_get(view.image, EINA_TRUE);
    if (!pixels)
        return;
    GdkRGBA paper = {};
    webkit_web_view_get_background_color(view.page, &paper);
    const auto channel = [](double part) { return static_cast<uint32_t>(part * 255 + 0.5); };
    const uint32_t colour = 0xff000000U | channel(paper.red) << 16 | channel(paper.green) << 8 | channel(paper.blue);
    std::fill_n(static_cast<uint32_t *>(pixels), evas_object_image_stride_get(view.image) / 4 * height, colour);
    evas_object_image_data_set(view.image, pixels);
    evas_object_image_data_update_add(view.image, 0, 0, width, height);
}

// The toolkit has drawn into its window, which is memory that the X server keeps.
gboolean damaged(GtkWidget *, GdkEventExpose *event, gpointer data)
{
    View &view = view_of(data);
    cairo_surface_t *drawn = gtk_offscreen_window_get_surface(GTK_OFFSCREEN_WINDOW(view.offscreen));
    GtkAllocation size = {};
    gtk_widget_get_allocation(view.offscreen, &size);
    if (!drawn || size.width < 1 || size.height < 1)
        return FALSE;
    GdkRectangle area = event->area;
    int width = 0, height = 0;
    evas_object_image_size_get(view.image, &width, &height);
    if (width != size.width || height != size.height) {
        evas_object_image_size_set(view.image, size.width, size.height);
        area = {0, 0, size.width, size.height};
    }
    auto *pixels = static_cast<unsigned char *>(evas_object_image_data_get(view.image, EINA_TRUE));
    if (!pixels)
        return FALSE;
    cairo_surface_t *shown = cairo_image_surface_create_for_data(pixels, CAIRO_FORMAT_RGB24, size.width, size.height,
                                                                 evas_object_image_stride_get(view.image));
    cairo_t *painter = cairo_create(shown);
    cairo_set_source_surface(painter, drawn, 0, 0);
    cairo_set_operator(painter, CAIRO_OPERATOR_SOURCE);
    cairo_rectangle(painter, area.x, area.y, area.width, area.height);
    cairo_fill(painter);
    cairo_destroy(painter);
    cairo_surface_flush(shown);
    cairo_surface_destroy(shown);
    evas_object_image_data_set(view.image, pixels);
    evas_object_image_data_update_add(view.image, area.x, area.y, area.width, area.height);
    watch_painted(view);
    return FALSE;
}

void placed(void *data, Evas *, Evas_Object *obj, void *)
{
    View &view = view_of(data);
    int x = 0, y = 0, width = 0, height = 0, old_width = 0, old_height = 0;
    evas_object_geometry_get(obj, &x, &y, &width, &height);
    evas_object_geometry_get(view.image, nullptr, nullptr, &old_width, &old_height);
    evas_object_geometry_set(view.image, x, y, width, height);
    if (width < 1 || height < 1 || (width == old_width && height == old_height))
        return;
    gtk_widget_set_size_request(GTK_WIDGET(view.page), width, height); // an offscreen window follows both ways
    view_zoom(view);
}

void shown(void *data, Evas *, Evas_Object *, void *)
{
    evas_object_show(view_of(data).image);
    gtk_widget_show(view_of(data).offscreen);
}

void hidden(void *data, Evas *, Evas_Object *, void *)
{
    evas_object_hide(view_of(data).image);
    gtk_widget_hide(view_of(data).offscreen);
}

void page_make(View &view)
{
    view.page = engine_page_new();
    view.offscreen = gtk_offscreen_window_new();
    gtk_container_add(GTK_CONTAINER(view.offscreen), GTK_WIDGET(view.page));
    g_signal_connect(view.offscreen, "damage-event", G_CALLBACK(damaged), &view);
    // it would be a window of the toolkit's own, which takes clicks
    g_signal_connect(view.page, "query-tooltip",
                     G_CALLBACK(+[](GtkWidget *page, int, int, gboolean, GtkTooltip *, gpointer) -> gboolean {
                         g_signal_stop_emission_by_name(page, "query-tooltip");
                         return FALSE;
                     }),
                     nullptr);
    policy_connect(view);
    menu_connect(view);
    dialog_connect(view);
    watch_connect(view);
    input_connect(view);
    gtk_widget_set_size_request(GTK_WIDGET(view.page), 480, 800);
    gtk_widget_show_all(view.offscreen);
    gtk_widget_grab_focus(GTK_WIDGET(view.page));
}

void let_go(View *view)
{
    // After a touch the toolkit keeps the window of a page that is gone: it is to keep a small one.
    if (GdkWindow *window = gtk_widget_get_window(view->offscreen))
        gdk_window_resize(window, 1, 1);
    gtk_widget_destroy(view->offscreen);
    delete view;
}

void deleted(void *data, Evas *, Evas_Object *, void *)
{
    View &view = view_of(data);
    const Hold hold(view);
    std::erase(all, &view);
    watch_stop(view);
    inspect_stop(view);
    input_disconnect(view);
    evas_object_del(view.popup);
    if (view.asking)
        g_cancellable_cancel(view.asking.get());
    g_signal_handlers_disconnect_by_data(view.page, &view);
    g_signal_handlers_disconnect_by_data(view.offscreen, &view);
    webkit_web_view_stop_loading(view.page);
    evas_object_del(view.image);
    view.obj = view.image = nullptr;
}
} // namespace

Hold::~Hold()
{
    if (--view.holds > 0 || view.obj)
        return;
    // The engine may be on the stack still, in the middle of a signal.
    g_idle_add_full(
        G_PRIORITY_DEFAULT,
        [](gpointer data) -> gboolean { return let_go(static_cast<View *>(data)), G_SOURCE_REMOVE; }, &view, nullptr);
}

const std::vector<View *> &views()
{
    return all;
}

View *view_find(const Evas_Object *obj)
{
    const auto found = std::ranges::find(all, obj, [](const View *view) { return view->obj; });
    return found == all.end() ? nullptr : *found;
}

void view_emit(View &view, const char *event, void *info)
{
    if (view.obj && !view.is_dead)
        evas_object_smart_callback_call(view.obj, event, info);
}

bool view_is_seen(const View &view)
{
    return evas_object_visible_get(view.obj) && !elm_win_iconified_get(view.window);
}

// At the scale 1.8 a page is laid out as on a telephone: 480 pixels are 360 of CSS. A narrower view keeps its page from
// becoming too narrow, with smaller letters.
void view_zoom(View &view)
{
    int width = 0;
    evas_object_geometry_get(view.image, nullptr, nullptr, &width, nullptr);
    const double scale = elm_config_scale_get() / 1.8;
    const double zoom = scale * std::clamp(width / scale / 360, 1.0, 4.0 / 3);
    // The engine has a zoom of the page and one of its text, of which the setting names the one to be set; a change of
    // the setting that the page hears of resets the other.
    WebKitSettings *settings = webkit_web_view_get_settings(view.page);
    webkit_web_view_set_zoom_level(view.page, zoom);
    g_signal_handlers_block_matched(settings, G_SIGNAL_MATCH_DATA, 0, 0, nullptr, nullptr, view.page);
    webkit_settings_set_zoom_text_only(settings, TRUE);
    webkit_web_view_set_zoom_level(view.page, view.text_zoom);
    webkit_settings_set_zoom_text_only(settings, FALSE);
    g_signal_handlers_unblock_matched(settings, G_SIGNAL_MATCH_DATA, 0, 0, nullptr, nullptr, view.page);
}

Evas_Object *view_add(Evas_Object *parent)
{
    if (!engine_start())
        return nullptr;
    static unsigned serial = 0;
    auto *view = new View;
    view->serial = ++serial;
    view->obj = elm_layout_add(parent);
    view->window = elm_object_top_widget_get(parent);
    elm_object_focus_allow_set(view->obj, EINA_TRUE);
    view->image = evas_object_image_filled_add(evas_object_evas_get(parent));
    evas_object_image_alpha_set(view->image, EINA_FALSE);
    evas_object_image_size_set(view->image, 1, 1);
    evas_object_smart_member_add(view->image, view->obj);
    page_make(*view);
    paper_paint(*view);
    evas_object_event_callback_add(view->obj, EVAS_CALLBACK_MOVE, placed, view);
    evas_object_event_callback_add(view->obj, EVAS_CALLBACK_RESIZE, placed, view);
    evas_object_event_callback_add(view->obj, EVAS_CALLBACK_SHOW, shown, view);
    evas_object_event_callback_add(view->obj, EVAS_CALLBACK_HIDE, hidden, view);
    evas_object_event_callback_add(view->obj, EVAS_CALLBACK_DEL, deleted, view);
    all.push_back(view);
    inspect_start(*view);
    return view->obj;
}
