#include "velora_upload_file/upload_open.h"
#include "mime_type/mime_type.h"
#include "notification/notification.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_handles.h"
#include "velora_common/velora_local_data.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_paths.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_types.h"
#include <Ecore_File.h>
#include <cstdint>
#include <cstdlib>
#include <cstring>

static const char s_topic[] = "opening";
static const char s_video_player[] = "com.orvant.video-player-lite";
static const char s_sound_player[] = "com.orvant.sound-player-lite";

static std::string __scratch_folder()
{
    return _velora_common_media_root() + "/Downloads/.com.orvant.docshelf/files/scratch";
}

// A name that came from the service as a file of the scratch folder: empty when it could mean any other place, or
// cannot be written at all.
static std::string __scratch_path(const std::string &name)
{
    if (name.empty() || name.size() > 255 || name == "." || name == "..")
        return {};
    for (const char c : name)
        if (c == '/' || static_cast<unsigned char>(c) < 0x20 || c == 0x7f)
            return {};
    return __scratch_folder() + "/" + name;
}

static void __velora_popup_indicator_popup(const char *text)
{
    if (const int result = notification_status_message_post(text); result != 0)
        VELORA_LOGE("status_message_post()... [0x%x]!", static_cast<unsigned>(result));
}

static void result_cb(app_control_h, app_control_h, app_control_result_e result, void *)
{
    // A viewer's usual answer is no error.
    if (result == APP_CONTROL_RESULT_SUCCEEDED)
        VELORA_LOGI("===================== result is [%d]", result);
    else
        VELORA_LOGE("===================== result is [%d]", result);
}

static void __launch_player(app_control_h request, const char *player)
{
    if (const int result = app_control_set_operation(request, APP_CONTROL_OPERATION_VIEW); result != 0) {
        VELORA_LOGE("app_control_set_operation()... [0x%x]", static_cast<unsigned>(result));
        return;
    }
    if (const int result = app_control_set_app_id(request, player); result != 0) {
        VELORA_LOGE("app_control_set_uri()... [0x%x]", static_cast<unsigned>(result));
        return;
    }
    if (app_control_send_launch_request(request, nullptr, nullptr) != 0)
        __velora_popup_indicator_popup(__text("No application can perform this action!"));
}

static int __launch_apps_for_velora(ItemData *record)
{
    if (!record) {
        VELORA_LOGE("data is NULL");
        return -1;
    }
    VELORA_LOGI(" type is [%d]", record->file_type);
    app_control_h request = nullptr;
    if (const int result = app_control_create(&request); result != 0) {
        VELORA_LOGE("app_control_create()... [0x%x]", static_cast<unsigned>(result));
        return 0;
    }
    int outcome = 0;
    if (record->file_type == FILE_TYPE_VIDEO) {
        app_control_set_uri(request, record->stream_url.c_str());
        __launch_player(request, s_video_player);
    } else if (record->file_type == FILE_TYPE_SOUND) {
        app_control_add_extra_data(request, "request_type", "files");
        app_control_add_extra_data(request, "files", record->stream_url.c_str());
        app_control_add_extra_data(request, "filecount", "1");
        __launch_player(request, s_sound_player);
    } else {
        VELORA_LOGE("uri is [%s]", record->local_path.c_str());
        if (record->local_path.empty() || !ecore_file_exists(record->local_path.c_str())) {
            outcome = 2;
        } else {
            app_control_set_uri(request, record->local_path.c_str());
            app_control_set_operation(request, APP_CONTROL_OPERATION_VIEW);
            if (app_control_send_launch_request(request, result_cb, nullptr) != 0)
                __velora_popup_indicator_popup(__text("No application can perform this action!"));
        }
    }
    app_control_destroy(request);
    return outcome;
}

// The client's thread: the arguments are copied into a record for the main loop, and nothing else is touched.
static void __content_result_send(int kind, int state, const char *text, int third, int error, void *user_data)
{
    ContentResultMessage message;
    message.error = error;
    message.kind = kind;
    message.state = state;
    message.row = static_cast<uint32_t>(reinterpret_cast<uintptr_t>(user_data));
    const uint32_t copy = text ? _velora_common_handle_add(strdup(text)) : 0;
    if (kind == CONTENT_RESULT_STREAMING_URL) {
        message.streaming_third = third;
        message.url = copy;
    } else {
        message.third = third;
        message.path = copy;
    }
    if (!_velora_common_pipe_send(s_view_pipe, &message, sizeof message)) {
        VELORA_LOGE("ecore_pipe_write failed");
        std::free(_velora_common_handle_remove(copy));
    }
}

static void __cloud_content_sync_cache_file_get_result_cb(int state, const char *path, int third, int error, void *row)
{
    __content_result_send(CONTENT_RESULT_CACHED_FILE, state, path, third, error, row);
}

static void kq_cloud_content_sync_streaming_url_result_cb(int state, const char *url, int third, int error, void *row)
{
    __content_result_send(CONTENT_RESULT_STREAMING_URL, state, url, third, error, row);
}

static void __cloud_content_sync_launching_download_result_cb(int state, const char *path, int third, int error,
                                                              void *row)
{
    __content_result_send(CONTENT_RESULT_DOWNLOAD, state, path, third, error, row);
}

static void __say_failed(int error)
{
    __velora_popup_indicator_popup(error == CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE ? __text("IDS_VELORA_BODY_NOT_SAVED")
                                                                                : __failure_text(error));
}

// The row's request has ended, or does not matter any more: no wait for it is left.
static void __request_over(UploadViewData *vd, ItemData *record)
{
    record->request_id = 0;
    _velora_popup_take_away(vd->ad, {record, s_topic});
}

void __content_result_handle(UploadViewData *vd, const ContentResultMessage &message)
{
    char *path = static_cast<char *>(_velora_common_handle_remove(message.path));
    char *url = static_cast<char *>(_velora_common_handle_remove(message.url));
    auto *record = static_cast<ItemData *>(_velora_common_handle_find(message.row));
    // A row that is gone, or whose request was cancelled, has nothing to be opened.
    if (record && record->request_id != 0) {
        if (message.state == CLOUD_CONTENT_SYNC_STATE_DONE && message.error == 0) {
            __request_over(vd, record);
            if (message.kind == CONTENT_RESULT_STREAMING_URL)
                record->stream_url = url ? url : "";
            else if (message.kind == CONTENT_RESULT_CACHED_FILE)
                record->local_path = path ? path : "";
            else
                record->local_path = __scratch_path(record->file_name);
            __launch_apps_for_velora(record);
        } else if (message.state == CLOUD_CONTENT_SYNC_STATE_FAILED) {
            __request_over(vd, record); // a wait for nothing would say less than the words that follow
            __say_failed(message.error);
        }
    }
    std::free(path);
    std::free(url);
}

static void __request_cancel(UploadViewData *vd, ItemData *record)
{
    if (record->request_id && vd->client)
        cloud_content_sync_cancel(vd->client.get(), record->request_id);
    __request_over(vd, record);
}

static void __content_row_forget(ItemData *record)
{
    if (s_vd)
        __request_cancel(s_vd, record);
    _velora_common_handle_remove(record->handle);
    record->handle = 0;
}

static void __content_sync_popup_cb(void *data, Evas_Object *, void *)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record || !s_vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    __request_cancel(s_vd, record);
}

// Another popup stands where the wait stood: what comes would come as a surprise.
static void __wait_replaced_cb(void *data)
{
    __content_sync_popup_cb(data, nullptr, nullptr);
}

static void __processing_popup_show(UploadViewData *vd, ItemData *record)
{
    _velora_popup_show(vd->ad, {record, s_topic},
                       _velora_common_create_processing_popup_with_cancel(
                           vd->ad->win_main, "IDS_CLOUD_BODY_PROCESSING_ING", __content_sync_popup_cb, record),
                       __wait_replaced_cb, record);
}

static bool __is_online(UploadViewData *vd)
{
    if (_velora_common_check_network_without_popup(vd->ad))
        return true;
    VELORA_LOGE("network error");
    _velora_popup_show(vd->ad, {vd, s_topic},
                       _velora_common_create_one_text_popup_with_timer(vd->ad->win_main, vd->ad));
    return false;
}

static void *__row_handle(ItemData *record)
{
    __row_forget_cb_set(__content_row_forget);
    if (!record->handle)
        record->handle = _velora_common_handle_add(record);
    return reinterpret_cast<void *>(static_cast<uintptr_t>(record->handle));
}

static void __request_refused(UploadViewData *vd, ItemData *record, int err)
{
    VELORA_LOGE("err is [%d]", err);
    __request_over(vd, record);
    __say_failed(err);
}

// What is here already is opened at once; what is not is asked for behind a wait.
static void __open_or_request(UploadViewData *vd, ItemData *record, bool is_here, int (*request)(ItemData *))
{
    if (is_here) {
        __launch_apps_for_velora(record);
        return;
    }
    if (!__is_online(vd))
        return;
    __processing_popup_show(vd, record);
    if (const int err = request(record); err != 0)
        __request_refused(vd, record, err);
}

static int __picture_request(ItemData *record)
{
    return cloud_content_sync_content_get_cached_file(
        record->content, &record->request_id, __cloud_content_sync_cache_file_get_result_cb, __row_handle(record));
}

static int __stream_request(ItemData *record)
{
    constexpr int minutes = 30;
    return cloud_content_sync_content_get_streaming_url(record->content, &record->request_id,
                                                        kq_cloud_content_sync_streaming_url_result_cb,
                                                        __row_handle(record), minutes);
}

static bool match_cb(app_control_h, const char *, void *user_data)
{
    if (!user_data) {
        VELORA_LOGE("user_data is NULL");
        return false;
    }
    ++*static_cast<int *>(user_data);
    return true;
}

static bool __has_viewer(const char *mime)
{
    app_control_h request = nullptr;
    if (app_control_create(&request) != 0)
        return false;
    int count = 0;
    const bool is_counted = app_control_set_mime(request, mime) == 0 &&
                            app_control_set_operation(request, APP_CONTROL_OPERATION_VIEW) == 0 &&
                            app_control_foreach_app_matched(request, match_cb, &count) == 0;
    app_control_destroy(request);
    return is_counted && count > 0;
}

// False when no installed application views files of this name's MIME type.
static bool __launch_get_match(const std::string &name)
{
    if (name.empty()) {
        VELORA_LOGE("name is NULL");
        return false;
    }
    char *ext = nullptr;
    if (_velora_common_file_attr_get_file_ext(name.c_str(), &ext) != 0)
        return false;
    char *mime = nullptr;
    const bool is_viewable = mime_type_get_mime_type(ext, &mime) == 0 && mime && __has_viewer(mime);
    std::free(mime);
    g_free(ext);
    return is_viewable;
}

// The scratch folder knows files by their name alone: a copy of another length is another folder's file, or an older
// one.
static bool __is_copy_of(const std::string &copy, const ItemData *record)
{
    long long size = -1;
    return ecore_file_exists(copy.c_str()) && !ecore_file_is_dir(copy.c_str()) &&
           cloud_content_sync_content_get_size(record->content, &size) == 0 && ecore_file_size(copy.c_str()) == size;
}

static void __open_document(UploadViewData *vd, ItemData *record)
{
    if (!__is_online(vd))
        return;
    const std::string copy = __scratch_path(record->file_name);
    if (!__launch_get_match(record->file_name) || copy.empty()) {
        __velora_popup_indicator_popup(__text("No application can perform this action!"));
        VELORA_LOGE("__launch_get_match is failed!");
        return;
    }
    if (ecore_file_is_dir(__scratch_folder().c_str()) && __is_copy_of(copy, record)) {
        record->local_path = copy;
        __launch_apps_for_velora(record);
        return;
    }
    ecore_file_mkpath(__scratch_folder().c_str());
    __processing_popup_show(vd, record);
    if (const int err = cloud_content_sync_content_download(record->content, copy.c_str(), &record->request_id,
                                                            __cloud_content_sync_launching_download_result_cb,
                                                            __row_handle(record));
        err != 0)
        __request_refused(vd, record, err);
}

void __opened_copies_delete()
{
    if (ecore_file_is_dir(__scratch_folder().c_str()) && !ecore_file_recursive_rm(__scratch_folder().c_str()))
        VELORA_LOGE("copies of opened files are left");
}

void __select_item_to_launch_app(void *data, Evas_Object *, void *event_info)
{
    auto *record = static_cast<ItemData *>(data);
    UploadViewData *vd = s_vd;
    if (!record || !vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (event_info)
        elm_genlist_item_selected_set(static_cast<Elm_Object_Item *>(event_info), EINA_FALSE);
    if (record->request_id) // a second tap while the first one's wait is showing
        return;
    switch (record->file_type) {
    case FILE_TYPE_IMAGE: // the cache may have let it go
        __open_or_request(vd, record, ecore_file_exists(record->local_path.c_str()), __picture_request);
        break;
    case FILE_TYPE_VIDEO:
    case FILE_TYPE_SOUND:
        __open_or_request(vd, record, !record->stream_url.empty(), __stream_request);
        break;
    default:
        __open_document(vd, record);
    }
}
