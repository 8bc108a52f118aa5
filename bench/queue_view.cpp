// One long queue in the upload view, or a plain list of as many rows, measured in this process: real widgets without a
// display, the real cloud client over a service in memory (tests/fakes). Prints one line of JSON; bench/run runs it.
//
// usage: queue_view app|genlist|app-page|genlist-page FILES     -page: until the page or the first row, and no further
#include "account/account.h"
#include "base/base.h"
#include "driver.h"
#include "fake_app.h"
#include "fake_cloud.h"
#include "temp_home.h"
#include "vconf/vconf.h"
#include "velora_common/velora_app_data.h"
#include "velora_upload_file/upload_record.h"
#include "velora_upload_file/upload_row.h"
#include <algorithm>
#include <clocale>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <fstream>
#include <malloc.h>
#include <vector>

int velora_main(int argc, char **argv);

namespace {

double seconds_of(clockid_t clock)
{
    timespec time = {};
    clock_gettime(clock, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

double now()
{
    return seconds_of(CLOCK_MONOTONIC);
}

// Times in seconds. A stall is the longest time that a timer of the main loop had to wait beyond its period; its own
// part is what the main thread itself ran meanwhile, which a busy machine leaves alone.
struct Figures {
    double page = 0, first_row = 0, run_end = 0, quiet = 0, stall = 0, stall_own = 0, cpu = 0, cpu_main = 0;
    double bytes_per_file = 0;
};

constexpr double PERIOD = 0.004;

struct Stall {
    double last = now(), last_own = seconds_of(CLOCK_THREAD_CPUTIME_ID), worst = 0, worst_own = 0;
    Ecore_Timer *timer = nullptr;

    Stall()
    {
        timer = ecore_timer_add(
            PERIOD,
            [](void *data) -> Eina_Bool {
                static_cast<Stall *>(data)->look();
                return ECORE_CALLBACK_RENEW;
            },
            this);
    }
    Stall(const Stall &) = delete;
    Stall &operator=(const Stall &) = delete;
    ~Stall()
    {
        ecore_timer_del(timer);
    }
    void look()
    {
        const double time = now(), own = seconds_of(CLOCK_THREAD_CPUTIME_ID);
        worst = std::max(worst, time - last - PERIOD);
        worst_own = std::max(worst_own, own - last_own);
        last = time;
        last_own = own;
    }
};

// What the main thread had of the machine so far, in seconds.
struct Share {
    double ran = 0, waited = 0; // for a processor that was busy with others

    Share()
    {
        std::ifstream("/proc/thread-self/schedstat") >> ran >> waited;
        ran /= 1e9; // of nanoseconds
        waited /= 1e9;
    }
};

// When the main thread has come to rest: the start of the first quarter of a second in which it ran for less than a
// tenth of the time that it could have.
double wait_for_quiet()
{
    double since = now();
    Share before;
    driver::run_until(
        [&] {
            const double time = now();
            if (time - since < 0.25)
                return false;
            const Share share;
            if (share.ran - before.ran < 0.1 * (time - since - (share.waited - before.waited)))
                return true;
            since = time;
            before = share;
            return false;
        },
        600);
    return since;
}

bool is_row_seen(Evas_Object *genlist)
{
    Eina_List *realized = elm_genlist_realized_items_get(genlist);
    const bool is_seen = realized;
    eina_list_free(realized);
    return is_seen;
}

void genlist_of(int files, bool is_page, Figures *figures)
{
    driver::start();
    Evas_Object *window = elm_win_util_standard_add("bench", "bench");
    evas_object_resize(window, 480, 800);
    Evas_Object *genlist = elm_genlist_add(window);
    elm_genlist_mode_set(genlist, ELM_LIST_COMPRESS);
    evas_object_size_hint_weight_set(genlist, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_win_resize_object_add(window, genlist);
    evas_object_show(genlist);
    evas_object_show(window);
    driver::settle();
    Elm_Genlist_Item_Class *itc = elm_genlist_item_class_new();
    itc->item_style = "default";
    itc->func.text_get = [](void *data, Evas_Object *, const char *) -> char * {
        char text[32];
        std::snprintf(text, sizeof text, "%zu.txt", reinterpret_cast<size_t>(data));
        return strdup(text);
    };
    const double cpu = seconds_of(CLOCK_PROCESS_CPUTIME_ID), cpu_main = seconds_of(CLOCK_THREAD_CPUTIME_ID);
    Stall stall;
    const double start = now();
    for (int i = 0; i < files; i++)
        elm_genlist_item_append(genlist, itc, reinterpret_cast<void *>(static_cast<size_t>(i)), nullptr,
                                ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
    driver::run_until([&] { return is_row_seen(genlist); }, 600);
    figures->first_row = figures->page = now() - start;
    if (!is_page)
        figures->quiet = wait_for_quiet() - start;
    figures->stall = stall.worst;
    figures->stall_own = stall.worst_own;
    figures->cpu = seconds_of(CLOCK_PROCESS_CPUTIME_ID) - cpu;
    figures->cpu_main = seconds_of(CLOCK_THREAD_CPUTIME_ID) - cpu_main;
    elm_genlist_item_class_free(itc);
    evas_object_del(window);
}

std::vector<std::string> make_files(const TempFolder &folder, int count)
{
    std::vector<std::string> paths;
    static const char *const kinds[] = {"jpg", "txt", "pdf", "mp4"};
    for (int i = 0; i < count; i++)
        paths.push_back(folder.file("files/" + std::to_string(i) + "." + kinds[i % 4], "a file of the queue"));
    return paths;
}

size_t used_memory()
{
    malloc_trim(0);
    return mallinfo2().uordblks + mallinfo2().hblkhd;
}

void share(const std::vector<std::string> &paths)
{
    app_control_h request = fake_app::receive(APP_CONTROL_OPERATION_MULTI_SHARE);
    std::vector<const char *> words;
    for (const std::string &path : paths)
        words.push_back(path.c_str());
    app_control_add_extra_data_array(request, APP_CONTROL_DATA_PATH, words.data(), static_cast<int>(words.size()));
    fake_app::request(request);
    app_control_destroy(request);
}

bool is_done_ready()
{
    const UploadViewData *vd = s_vd;
    return vd && vd->done_btn && !vd->ad->popup && !elm_object_disabled_get(vd->done_btn);
}

void queue_of(const std::vector<std::string> &paths, bool is_page, Figures *figures)
{
    const size_t memory = used_memory();
    const double begin = now();
    share(paths);
    driver::run_until(is_done_ready, 600);
    figures->page = now() - begin;
    driver::settle();
    wait_for_quiet();
    figures->bytes_per_file =
        (static_cast<double>(used_memory()) - static_cast<double>(memory)) / static_cast<double>(paths.size());
    if (is_page)
        return;
    const double cpu = seconds_of(CLOCK_PROCESS_CPUTIME_ID), cpu_main = seconds_of(CLOCK_THREAD_CPUTIME_ID);
    Stall stall;
    const double start = now();
    evas_object_smart_callback_call(s_vd->done_btn, "clicked", nullptr);
    driver::run_until([] { return s_vd->phase == PHASE_ENDED || is_row_seen(s_vd->genlist); }, 600);
    figures->first_row = now() - start;
    driver::run_until([] { return s_vd->phase == PHASE_ENDED; }, 3600);
    figures->run_end = now() - start;
    figures->quiet = wait_for_quiet() - start;
    figures->stall = stall.worst;
    figures->stall_own = stall.worst_own;
    figures->cpu = seconds_of(CLOCK_PROCESS_CPUTIME_ID) - cpu;
    figures->cpu_main = seconds_of(CLOCK_THREAD_CPUTIME_ID) - cpu_main;
}

void app_of(int files, bool is_page, Figures *figures)
{
    TempHome home;
    setlocale(LC_ALL, "C.UTF-8");
    setenv("LANGUAGE", "en", 1);
    driver::start();
    platform_package_set(VELORA_PACKAGE);
    vconf_set_str("memory/connection/type", "wifi");
    account_h account = nullptr;
    int id = 0;
    account_connect();
    account_create(&account);
    account_set_user_name(account, "ann@example.com");
    account_insert_to_db(account, &id);
    account_destroy(account);
    account_disconnect();
    fake_cloud_reset();
    fake_cloud_add_folder("/Velora");
    fake_cloud_refresh_now();
    const std::vector<std::string> paths = make_files(home, files);
    char name[] = "velora";
    char *arguments[] = {name, nullptr};
    fake_app::run([&] {
        queue_of(paths, is_page, figures);
        if (s_vd)
            _velora_app_exit(s_vd->ad);
        driver::settle();
    });
    velora_main(1, arguments);
    fake_app::clear();
}

} // namespace

int main(int argc, char **argv)
{
    const int files = argc == 3 ? std::atoi(argv[2]) : 0;
    const std::string kind = argc == 3 ? argv[1] : "";
    const bool is_app = kind.starts_with("app"), is_page = kind.ends_with("-page");
    if (files <= 0 || (kind != "app" && kind != "app-page" && kind != "genlist" && kind != "genlist-page")) {
        std::fprintf(stderr, "usage: queue_view app|genlist|app-page|genlist-page FILES\n");
        return 2;
    }
    Figures f;
    if (is_app)
        app_of(files, is_page, &f);
    else
        genlist_of(files, is_page, &f);
    std::printf("{\"page\": %.3f, \"first_row\": %.3f, \"stall\": %.3f, \"stall_own\": %.3f, \"run_end\": %.3f, "
                "\"quiet\": %.3f, \"cpu\": %.3f, \"cpu_main\": %.3f, \"bytes_per_file\": %.0f}\n",
                f.page, f.first_row, f.stall, f.stall_own, f.run_end, f.quiet, f.cpu, f.cpu_main, f.bytes_per_file);
    return 0;
}
