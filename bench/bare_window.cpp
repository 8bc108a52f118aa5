// The least that a window of the toolkit costs: a background, a title and nothing else. Prints the monotonic time in
// seconds at which its first frame was painted, and stays until it is ended.
#include <Efreet.h>
#include <Elementary.h>
#include <cstdio>
#include <ctime>

static void painted_cb(void *, Evas *canvas, void *)
{
    timespec time = {};
    clock_gettime(CLOCK_MONOTONIC, &time);
    std::printf("%.6f\n", static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9);
    std::fflush(stdout);
    evas_event_callback_del(canvas, EVAS_CALLBACK_RENDER_POST, painted_cb);
}

int main(int argc, char **argv)
{
    efreet_cache_disable(); // or each start leaves a daemon behind
    elm_init(argc, argv);
    Evas_Object *window = elm_win_util_standard_add("bare", "bare");
    evas_event_callback_add(evas_object_evas_get(window), EVAS_CALLBACK_RENDER_POST, painted_cb, nullptr);
    evas_object_resize(window, 480, 800);
    evas_object_show(window);
    elm_run();
    elm_shutdown();
    return 0;
}
