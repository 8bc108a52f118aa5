#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_state.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_wait.h"
#include "velora_upload_file/upload_waiting.h"
#include <algorithm>
#include <cstdio>
#include <cstdlib>

// The words, markup; of a single file its name, which a number could not tell.
static std::string __waiting_words()
{
    const int count = __waiting_count();
    if (count == 0)
        return {};
    char text[64];
    std::snprintf(text, sizeof text, __text_of("%d files", count), count);
    std::string words = text;
    if (count == 1) {
        char *name = __one_line_markup(__last_segment(__waiting_first()));
        words = name;
        std::free(name);
    }
    if (const std::optional<gint64> bytes = __waiting_bytes())
        words += " · " + __short_size(*bytes);
    return words;
}

static void __show_run(UploadViewData *vd)
{
    const UploadRun &run = *vd->run;
    RunReport &report = run.report;
    // From the files themselves: the worker counts one only after its state has changed. They end in their order.
    for (; report.seen < run.total(); report.seen++) {
        const RunFile &file = run.files[static_cast<size_t>(report.seen)];
        const int state = file.item->state;
        if (state == UPLOAD_STATE_WAITING || state == UPLOAD_STATE_UPLOADING)
            break;
        if (state != UPLOAD_STATE_CANCELED) {
            report.seen_ended++;
            report.seen_bytes += file.size;
        }
    }
    gint64 sent = report.seen_bytes;
    if (report.seen < run.total())
        if (const RunFile &file = run.files[static_cast<size_t>(report.seen)];
            file.item->state == UPLOAD_STATE_UPLOADING)
            sent += file.size / 100 * file.item->progress;
    const gint64 all = std::max<gint64>(run.bytes - report.bytes_canceled, 0);
    sent = std::clamp<gint64>(sent, 0, all);
    const int remaining = std::max(run.remaining(), 0);
    char words[128];
    std::snprintf(words, sizeof words, __text("%d of %d · %s of %s"), std::min(report.seen_ended, remaining), remaining,
                  __short_size(sent).c_str(), __short_size(all).c_str());
    const double done = all > 0 ? static_cast<double>(sent) / static_cast<double>(all) : 0;
    const std::string waiting = __wait_text(run);
    __info_set(vd, waiting.empty() ? words : waiting.c_str(), done);
}

static void __show_end(UploadViewData *vd)
{
    const int uploaded = static_cast<int>(__listed(vd, ITEM_TYPE_UPLOADED).size());
    const int failed = static_cast<int>(__listed(vd, ITEM_TYPE_FAILED).size());
    char words[160] = "";
    if (failed > 0)
        std::snprintf(words, sizeof words, __text_of("%d files not uploaded · Tap one to try again", failed), failed);
    else if (uploaded > 0)
        std::snprintf(words, sizeof words, __text_of("%d files uploaded", uploaded), uploaded);
    __info_set(vd, words);
}

void __progress_line_update(UploadViewData *vd)
{
    // What is wrong, and what is being chosen, has the room of a low window to itself.
    const ViewState state = __state_shown(vd);
    const bool is_trouble = state == VIEW_STATE_OFFLINE || state == VIEW_STATE_ERROR || state == VIEW_STATE_SIGNED_OUT;
    switch (vd->phase) {
    case PHASE_BROWSING:
        __info_set(vd, is_trouble ? nullptr : __waiting_words().c_str());
        break;
    case PHASE_UPLOADING:
        if (vd->is_select_mode)
            __info_set(vd, nullptr);
        else if (vd->run)
            __show_run(vd);
        break;
    case PHASE_ENDED:
    case PHASE_RESULT:
        __show_end(vd);
    }
}

static Ecore_Timer *s_update;
static double s_updated; // the last time

void __progress_line_update_soon()
{
    const auto update = [](void *) -> Eina_Bool {
        s_update = nullptr;
        s_updated = ecore_time_get();
        if (s_vd)
            __progress_line_update(s_vd);
        return ECORE_CALLBACK_CANCEL;
    };
    const double due = s_updated + ecore_animator_frametime_get();
    if (!s_update)
        s_update = ecore_timer_add(std::max(due - ecore_time_get(), 0.0), update, nullptr);
}
