#include "velora_upload_file/upload_start.h"
#include "velora_upload_file/upload_menu.h"
#include "velora_upload_file/upload_names.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_worker.h"
#include <Ecore_File.h>
#include <cmath>
#include <cstdio>
#include <optional>

void __run_create(UploadViewData *vd, std::vector<UploadItemHold> items, const std::string &folder)
{
    static int last_number;
    vd->run = std::make_shared<UploadRun>();
    UploadRun &run = *vd->run;
    run.number = ++last_number;
    run.client = vd->client;
    run.pipe = vd->pipe;
    run.folder = folder;
    run.report.selected = std::make_unique<std::atomic<bool>[]>(items.size());
    run.files.reserve(items.size());
    for (UploadItemHold &item : items) {
        item->index = run.total();
        item->error = 0;
        item->progress = 0;
        item->state = UPLOAD_STATE_WAITING;
        run.files.push_back({.run = &run, .index = item->index, .item = std::move(item)});
    }
}

// How far the latest run is.
struct Preparation {
    int run = 0; // its number
    size_t next = 0;
    std::optional<TakenNames> taken;
};
static Preparation s_preparation;

bool __run_prepare(UploadViewData *vd, double budget)
{
    UploadRun &run = *vd->run;
    if (s_preparation.run != run.number)
        s_preparation = {.run = run.number};
    const double start = ecore_time_get();
    for (; s_preparation.next < run.files.size(); s_preparation.next++) {
        if (ecore_time_get() - start > budget)
            return false;
        RunFile &file = run.files[s_preparation.next];
        UploadItem *item = file.item.get();
        item->size = file.size = ecore_file_size(item->path);
        run.bytes += file.size;
        if (!item->server_path) {
            if (!s_preparation.taken)
                s_preparation.taken.emplace(vd->folder);
            item->server_path = __get_server_path(*s_preparation.taken, run.folder.c_str(), item->path);
        }
        file.destination = item->server_path;
    }
    s_preparation.taken.reset();
    return true;
}

void __run_begin(UploadViewData *vd)
{
    UploadRun &run = *vd->run;
    __delete_all_callback_ctxpopup();
    __run_prepare(vd, HUGE_VAL);
    char text[32];
    std::snprintf(text, sizeof text, "%d / %d", 0, run.remaining());
    __progress_noti_new(text, &run.noti_id);
    vd->ad->noti_priv_id = run.noti_id;
    __more_button_create(vd, __more_create_folder_cb);
    if (__worker_start(&run))
        return;
    for (const RunFile &file : run.files) {
        file.item->error = CLOUD_CONTENT_SYNC_ERROR_SERVER; // words for a failure of no known kind
        file.item->state = UPLOAD_STATE_FAILED;
    }
    run.report.fail = run.total();
    __run_send(run, "end");
}
