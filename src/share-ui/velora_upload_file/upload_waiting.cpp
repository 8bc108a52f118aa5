#include "velora_upload_file/upload_waiting.h"
#include <Ecore_File.h>
#include <utility>

static std::vector<UploadItemHold> s_waiting;
static size_t s_measured; // so many of them, from the first one
static gint64 s_bytes;
static Ecore_Timer *s_measuring;
static void (*s_measured_cb)();

void __waiting_measured_cb_set(void (*measured)())
{
    s_measured_cb = measured;
}

// Asks for sizes as long as nobody minds; a hundred thousand files take longer than that. True: they are all known.
static bool __measure()
{
    constexpr double budget = 0.005; // seconds
    const double start = ecore_time_get();
    for (; s_measured < s_waiting.size(); s_measured++) {
        if (ecore_time_get() - start > budget)
            return false;
        UploadItem *item = s_waiting[s_measured].get();
        item->size = ecore_file_size(item->path);
        s_bytes += item->size;
    }
    return true;
}

static Eina_Bool __measure_cb(void *)
{
    if (!__measure())
        return ECORE_CALLBACK_RENEW;
    s_measuring = nullptr;
    if (s_measured_cb)
        s_measured_cb();
    return ECORE_CALLBACK_CANCEL;
}

int __waiting_take(AppData *ad)
{
    int count = 0;
    for (const GList *entry = ad->upload_list; entry; entry = entry->next, count++)
        s_waiting.emplace_back(_velora_upload_item_ref(static_cast<UploadItem *>(entry->data)));
    _velora_upload_list_free(&ad->upload_list);
    if (!s_measuring && !__measure())
        s_measuring = ecore_timer_add(0, __measure_cb, nullptr);
    return count;
}

int __waiting_count()
{
    return static_cast<int>(s_waiting.size());
}

std::optional<gint64> __waiting_bytes()
{
    return s_measured < s_waiting.size() ? std::nullopt : std::optional(s_bytes);
}

const char *__waiting_first()
{
    return s_waiting.empty() ? nullptr : s_waiting.front()->path;
}

std::vector<UploadItemHold> __waiting_give()
{
    s_bytes = 0;
    s_measured = 0;
    if (s_measuring)
        ecore_timer_del(std::exchange(s_measuring, nullptr));
    return std::exchange(s_waiting, {});
}
