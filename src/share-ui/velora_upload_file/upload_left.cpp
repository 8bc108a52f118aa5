#include "velora_upload_file/upload_left.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_book.h"
#include "velora_upload_file/upload_queue.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/velora_uploads.h"
#include <cstdio>
#include <cstring>

static const char s_topic[] = "left";
static bool s_is_put_off; // once is enough
static void (*s_later)(UploadViewData *vd);

bool _velora_upload_view_has_left(AppData *ad)
{
    if ((s_vd && s_vd->run) || s_is_put_off)
        return false;
    const ClientHold client = _velora_common_client_get(ad);
    return !__book_entries(client.get()).empty();
}

static void __later_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd || vd != s_vd || !_velora_popup_take_away(vd->ad, {vd, s_topic}))
        return;
    s_is_put_off = true;
    if (s_later)
        s_later(vd);
}

static void __go_on_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (vd && vd == s_vd && _velora_popup_take_away(vd->ad, {vd, s_topic}))
        __left_go_on(vd);
}

void __left_ask(UploadViewData *vd, void (*later)(UploadViewData *vd))
{
    if (vd->ad->popup || !_velora_upload_view_has_left(vd->ad))
        return;
    const int count = static_cast<int>(__book_entries(vd->client.get()).size());
    char words[160];
    std::snprintf(words, sizeof words, __text_of("%d files have not been uploaded yet.", count), count);
    s_later = later;
    _velora_popup_show(vd->ad, {vd, s_topic},
                       _velora_common_with_title_btn_popup(vd->ad->win_main, __text("IDS_VELORA_HEADER_GO_ON"), words,
                                                           __later_cb, __go_on_cb, __text("IDS_VELORA_BUTTON_LATER"),
                                                           __text("IDS_KQ_BUTTON_UPLOAD"), vd));
}

bool __left_go_on(UploadViewData *vd)
{
    if (vd->run)
        return false;
    std::vector<UploadItemHold> items;
    for (const BookEntry &entry : __book_entries(vd->client.get())) {
        char *path = const_cast<char *>(entry.path.c_str()); // copied
        GList *list = _velora_upload_items_append(nullptr, &path, 1);
        if (!list)
            continue;
        items.emplace_back(static_cast<UploadItem *>(list->data));
        items.back()->server_path = strdup(entry.destination.c_str());
        g_list_free(list);
    }
    VELORA_LOGI("%zu files were left", items.size());
    if (items.empty())
        return false;
    const std::string folder = __folder_of(items.front()->server_path);
    __run_of(vd, std::move(items), folder);
    return true;
}
