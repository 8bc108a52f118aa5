#include "driver.h"
#include "app/glib_loop.h"
#include "base/base.h"
#include <Ecore_Evas.h>
#include <Efreet.h>
#include <strings.h>
#include <unistd.h>
#include <utility>

namespace {
bool exited = false;
unsigned int now = 1; // the time stamp of the next input event, in milliseconds

struct Wait {
    const std::function<bool()> *condition;
    bool holds = false;
    bool over = false;
};

Eina_Bool check(void *data)
{
    auto *wait = static_cast<Wait *>(data);
    if (!wait->over && (*wait->condition)()) {
        wait->holds = wait->over = true;
        ecore_main_loop_quit();
    }
    return ECORE_CALLBACK_RENEW;
}

bool seen(Evas_Object *obj)
{
    int w = 0, h = 0;
    evas_object_geometry_get(obj, nullptr, nullptr, &w, &h);
    return evas_object_visible_get(obj) && w > 0 && h > 0;
}

bool click_at(Evas *evas, int x, int y, int button)
{
    int width = 0, height = 0;
    evas_output_size_get(evas, &width, &height);
    if (x < 0 || y < 0 || x >= width || y >= height)
        return false;
    evas_event_feed_mouse_in(evas, now, nullptr);
    evas_event_feed_mouse_move(evas, x, y, now, nullptr);
    evas_event_feed_mouse_down(evas, button, EVAS_BUTTON_NONE, now, nullptr);
    evas_event_feed_mouse_up(evas, button, EVAS_BUTTON_NONE, now + 20, nullptr);
    now += 1000; // far from the last click, so that it is no double click
    driver::settle();
    return true;
}

bool click_middle(Evas_Object *obj, int button)
{
    int x = 0, y = 0, w = 0, h = 0;
    evas_object_geometry_get(obj, &x, &y, &w, &h);
    return seen(obj) && click_at(evas_object_evas_get(obj), x + w / 2, y + h / 2, button);
}

Evas_Object *walk(Evas_Object *obj, const std::function<bool(Evas_Object *)> &passes)
{
    if (!evas_object_visible_get(obj))
        return nullptr;
    if (passes(obj))
        return obj;
    Evas_Object *found = nullptr;
    Eina_List *members = evas_object_smart_members_get(obj);
    void *member = nullptr;
    EINA_LIST_FREE(members, member)
    if (!found)
        found = walk(static_cast<Evas_Object *>(member), passes);
    return found;
}

// Empty for what is not a text.
std::string text_of(Evas_Object *obj)
{
    const std::string type = evas_object_type_get(obj);
    if (type == "text") {
        const char *text = evas_object_text_text_get(obj);
        return text ? text : "";
    }
    if (type != "textblock")
        return {};
    char *text = evas_textblock_text_markup_to_utf8(obj, evas_object_textblock_text_markup_get(obj));
    const std::string result = text ? text : "";
    free(text);
    return result;
}
} // namespace

namespace driver {

void start()
{
    static bool started = false;
    if (std::exchange(started, true))
        return;
    setenv("ELM_ENGINE", "buffer", 0);
    setenv("ELM_PROFILE", "mobile", 0);
    setenv("ELM_SCALE", "1.8", 0);
    setenv("EINA_LOG_LEVELS", "eldbus:0,eina_safety:0,ecore_system_upower:0,ecore_system_systemd:0", 0);
    efreet_cache_disable();
    elm_init(0, nullptr);
    glib_loop_start();
    edje_transition_duration_factor_set(0.01);
    if (const std::string theme = platform_data_file("theme/platform.edj"); !theme.empty())
        elm_theme_overlay_add(nullptr, theme.c_str());
}

bool run_until(const std::function<bool()> &condition, double seconds)
{
    Wait wait{&condition};
    Ecore_Idle_Enterer *enterer = ecore_idle_enterer_add(check, &wait);
    Ecore_Timer *poll = ecore_timer_add(0.005, check, &wait); // for what other threads change without a word
    Ecore_Timer *bound = ecore_timer_add(
        seconds,
        [](void *data) -> Eina_Bool {
            static_cast<Wait *>(data)->over = true;
            ecore_main_loop_quit();
            return ECORE_CALLBACK_RENEW;
        },
        &wait);
    while (!wait.over) {
        ecore_main_loop_begin();
        exited = exited || !wait.over;
    }
    ecore_timer_del(bound);
    ecore_timer_del(poll);
    ecore_idle_enterer_del(enterer);
    return wait.holds;
}

void settle()
{
    // a job queues behind what is there; what that queued in turn has run by the third
    for (int i = 0; i < 3; i++) {
        bool ran = false;
        ecore_job_add([](void *data) { *static_cast<bool *>(data) = true; }, &ran);
        run_until([&ran] { return ran; });
    }
    Eina_List *all = ecore_evas_ecore_evas_list_get();
    void *item = nullptr;
    EINA_LIST_FREE(all, item)
    ecore_evas_manual_render(static_cast<Ecore_Evas *>(item));
}

bool exit_requested()
{
    return std::exchange(exited, false);
}

bool click(Evas_Object *obj, int button)
{
    return click_middle(obj, button);
}

bool click_row(Elm_Object_Item *row)
{
    elm_genlist_item_show(row, ELM_GENLIST_ITEM_SCROLLTO_IN);
    Evas_Object *track = nullptr;
    settle();
    if (!run_until([&] { return (track = elm_object_item_track(row)) != nullptr; }, 1.0))
        return false;
    int x = 0, y = 0, w = 0, h = 0;
    evas_object_geometry_get(track, &x, &y, &w, &h);
    Evas *evas = evas_object_evas_get(track);
    elm_object_item_untrack(row);
    return w > 0 && h > 0 && click_at(evas, x + w / 2, y + h / 2, 1);
}

void press(Evas_Object *window, const char *key)
{
    Evas *evas = evas_object_evas_get(window);
    const char *text = key[0] && !key[1] ? key : nullptr;
    evas_event_feed_key_down(evas, key, key, text, nullptr, now, nullptr);
    evas_event_feed_key_up(evas, key, key, text, nullptr, now + 20, nullptr);
    now += 1000;
    settle();
}

Evas_Object *find(Evas_Object *below, const std::function<bool(Evas_Object *)> &passes)
{
    if (!elm_object_widget_check(below) || elm_object_top_widget_get(below) != below)
        return walk(below, passes);
    for (Evas_Object *obj = evas_object_bottom_get(evas_object_evas_get(below)); obj; obj = evas_object_above_get(obj))
        if (Evas_Object *found = walk(obj, passes))
            return found;
    return nullptr;
}

Evas_Object *find_widget(Evas_Object *below, const char *type, int nth)
{
    return find(below, [type, &nth](Evas_Object *obj) {
        const char *own = elm_object_widget_check(obj) ? elm_object_widget_type_get(obj) : nullptr;
        return own && strcasecmp(own, type) == 0 && nth-- == 0;
    });
}

Evas_Object *find_text(Evas_Object *below, const std::string &text)
{
    return find(below, [&text](Evas_Object *obj) { return seen(obj) && text_of(obj) == text; });
}

std::string read_texts(Evas_Object *below)
{
    std::string all;
    find(below, [&all](Evas_Object *obj) {
        if (const std::string text = seen(obj) ? text_of(obj) : ""; !text.empty())
            all += text + "\n";
        return false;
    });
    return all;
}

bool save_picture(Evas_Object *window, const std::string &path)
{
    settle();
    Evas *evas = evas_object_evas_get(window);
    Ecore_Evas *ee = ecore_evas_ecore_evas_get(evas);
    int w = 0, h = 0;
    ecore_evas_geometry_get(ee, nullptr, nullptr, &w, &h);
    const void *pixels = ecore_evas_buffer_pixels_get(ee);
    if (!pixels || w <= 0 || h <= 0)
        return false;
    Evas_Object *image = evas_object_image_add(evas);
    evas_object_image_size_set(image, w, h);
    evas_object_image_data_copy_set(image, const_cast<void *>(pixels));
    const bool saved = evas_object_image_save(image, path.c_str(), nullptr, nullptr);
    evas_object_del(image);
    return saved;
}

} // namespace driver
