// How full the account's storage is: asked of the service, shown as two sizes and a bar.
#include "velora_common/velora_log.h"
#include "velora_common/velora_number.h"
#include "velora_common/velora_pipe.h"
#include "velora_details_content_sync/details_record.h"
#include <cstdio>
#include <cstdlib>
#include <cstring>

static constexpr double s_warning = 0.9; // full enough to be said
static const char s_message[] = "storage.";

int __contentsync_storage_status_size_transition(unsigned long long bytes, char *out)
{
    constexpr size_t out_size = 30;
    constexpr unsigned long long mega = 1ULL << 20, giga = 1ULL << 30;
    const char *unit_id = "IDS_CLOUD_BODY_KB";
    double one = 1.0 / 1024;
    if (bytes >= giga) {
        unit_id = "IDS_CLOUD_BODY_GB";
        one = 1.0 / giga;
    } else if (bytes >= mega) {
        unit_id = "IDS_CLOUD_BODY_MB";
        one = 1.0 / mega;
    }
    const std::string number = _velora_common_number(static_cast<double>(bytes) * one, 2);
    if (std::snprintf(out, out_size, "%s%s", number.c_str(), __details_text(unit_id)) < 0) {
        VELORA_LOGE("ret<0");
        return -1;
    }
    return 0;
}

// False when there are no words for it.
static bool __storage_words(const DetailsViewData *vd, char *text, size_t size)
{
    if (!vd->is_storage_received) {
        std::snprintf(text, size, "IDS_CLOUD_OPT_LOADING_ING_ABB");
        return true;
    }
    if (vd->storage_total == 0) {
        const char *unit = __details_text("IDS_CLOUD_BODY_KB");
        std::snprintf(text, size, "0%s / 0%s", unit, unit);
        return true;
    }
    char total[30] = "", used[30] = "";
    if (__contentsync_storage_status_size_transition(vd->storage_total, total) != 0 ||
        __contentsync_storage_status_size_transition(vd->storage_used, used) != 0) {
        VELORA_LOGE("failed to transform");
        return false;
    }
    std::snprintf(text, size, "%s / %s", used, total);
    return true;
}

void __update_server_storage_info(DetailsViewData *vd)
{
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    char text[129] = "";
    if (!__storage_words(vd, text, sizeof text - 1))
        return;
    if (!vd->storage_item) {
        VELORA_LOGE("vd->storage_item is NULL");
        return;
    }
    __details_text2_set(vd->storage_item, text);
    elm_genlist_item_update(vd->storage_item);
}

Evas_Object *__storage_bar_create(Evas_Object *genlist, const DetailsItemData *row)
{
    const DetailsViewData *vd = row->vd;
    if (!vd->is_storage_received || vd->storage_total == 0)
        return nullptr;
    const double used = static_cast<double>(vd->storage_used) / static_cast<double>(vd->storage_total);
    Evas_Object *bar = elm_progressbar_add(genlist);
    elm_object_style_set(bar, "storage");
    elm_progressbar_horizontal_set(bar, EINA_TRUE);
    elm_progressbar_value_set(bar, used < 1 ? used : 1);
    evas_object_size_hint_align_set(bar, EVAS_HINT_FILL, EVAS_HINT_FILL);
    evas_object_size_hint_weight_set(bar, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    if (used >= s_warning)
        elm_layout_signal_emit(bar, "elm,state,warning", "elm");
    const std::string name = std::string(__details_text(row->text1)) + ", " + __details_text(row->text2);
    ea_screen_reader_name_set(bar, name.c_str());
    return bar;
}

// Client thread. The page cancels the question before it goes.
static void __server_storage_info_cb(int, unsigned long long total, unsigned long long used, int error, void *data)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (!vd) {
        VELORA_LOGE("s_vd is NULL");
        return;
    }
    vd->answer_total = total;
    vd->answer_used = used;
    vd->answer_error = error;
    char message[24];
    std::snprintf(message, sizeof message, "%s%d", s_message, vd->question.load());
    _velora_common_pipe_send_msg(vd->pipe, message);
}

void __storage_pipe_cb(void *data, void *buffer, unsigned int)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    const auto *message = static_cast<const char *>(buffer);
    if (!message || !g_str_has_prefix(message, s_message)) {
        VELORA_LOGE("pipe message error");
        return;
    }
    if (!vd->is_asking || std::atoi(message + std::strlen(s_message)) != vd->question) // it was given up
        return;
    vd->is_asking = false;
    if (const int error = vd->answer_error; error != 0) {
        VELORA_LOGE(" Failed with err: %d", error);
    } else {
        vd->storage_total = vd->answer_total;
        vd->storage_used = vd->answer_used;
    }
    vd->is_storage_received = 1;
    __update_server_storage_info(vd);
}

void __storage_ask(DetailsViewData *vd)
{
    if (vd->is_asking)
        return;
    vd->is_asking = true;
    vd->question++;
    const int error = cloud_content_sync_get_server_storage_info(vd->client.get(), __server_storage_info_cb, vd);
    if (error == 0)
        return;
    VELORA_LOGE("cloud_content_sync_get_server_storage_info return err = %d\n", error);
    vd->is_asking = false;
    vd->is_storage_received = 1;
    __update_server_storage_info(vd);
}

void __storage_forget(DetailsViewData *vd)
{
    if (vd->is_asking)
        cloud_content_sync_cancel_server_storage_info(vd->client.get(), vd);
    vd->is_asking = false;
    vd->is_storage_received = 0;
    vd->storage_total = vd->storage_used = 0;
}
