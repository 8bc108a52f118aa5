#include "velora_upload_file/upload_thumbnails.h"
#include "velora_common/velora_handles.h"
#include "velora_common/velora_pipe.h"
#include "velora_upload_file/upload_row.h"
#include "velora_upload_file/upload_text.h"
#include <cstdio>
#include <cstdlib>
#include <cstring>

// The client's thread: the path travels as a handle, in a text that is never as long as a content result.
static void __cloud_thumbnail_cb(const char *server_path, void *)
{
    const uint32_t handle = _velora_common_handle_add(strdup(server_path));
    char message[24];
    const int length = std::snprintf(message, sizeof message, "thumb.%u", static_cast<unsigned>(handle));
    if (!_velora_common_pipe_send(s_view_pipe, message, static_cast<size_t>(length) + 1))
        std::free(_velora_common_handle_remove(handle));
}

void __cloud_thumbnails_watch(UploadViewData *vd, bool is_on)
{
    if (vd->client)
        cloud_content_sync_set_thumbnail_cb(vd->client.get(), is_on ? __cloud_thumbnail_cb : nullptr, nullptr);
}

// Whether a row's file is `name` of the open folder: the rows of files are always those of the open folder.
static bool __is_row_of(const ItemData *record, const char *name)
{
    return record && record->type == ITEM_TYPE_CONTENT && record->content && record->file_name == name;
}

void __cloud_thumbnail_arrived(UploadViewData *vd, uint32_t handle)
{
    char *path = static_cast<char *>(_velora_common_handle_remove(handle));
    if (!path)
        return;
    const char *name = __last_segment(path);
    const std::string folder = __folder_of(path);
    // Rows out of sight ask for the thumbnail when they come back.
    if (vd->phase == PHASE_BROWSING && vd->ad->folder_path && folder == vd->ad->folder_path) {
        Eina_List *rows = elm_genlist_realized_items_get(vd->genlist);
        void *row = nullptr;
        EINA_LIST_FREE(rows, row)
        {
            auto *item = static_cast<Elm_Object_Item *>(row);
            if (!__is_row_of(__row_record(item), name))
                continue;
            for (const char *part : {"elm.icon", "elm.icon.1"})
                elm_genlist_item_fields_update(item, part, ELM_GENLIST_ITEM_FIELD_CONTENT);
        }
    }
    std::free(path);
}
