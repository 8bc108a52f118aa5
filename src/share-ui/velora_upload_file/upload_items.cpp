// The one view and the files it is about.
#include "velora_upload_file/upload_internal.h"
#include <cstring>

std::atomic<UploadViewData *> s_vd = nullptr;
std::atomic<Ecore_Pipe *> s_view_pipe = nullptr;

const char *__last_segment(const char *path)
{
    const char *slash = path ? std::strrchr(path, '/') : nullptr;
    return slash ? slash + 1 : path;
}

UploadItem *__upload_item_find(UploadViewData *vd, int index)
{
    return index < 0 ? nullptr
                     : static_cast<UploadItem *>(g_list_nth_data(vd->ad->upload_list, static_cast<guint>(index)));
}

UploadItem *__run_item(const UploadViewData *vd, int index)
{
    const size_t at = vd->run.size() == 1 ? 0 : static_cast<size_t>(index);
    UploadItem *item = at < vd->run.size() ? vd->run[at] : nullptr;
    return item && item->index == index ? item : nullptr;
}

UploadItem *__upload_item_find_running(UploadViewData *vd, int index)
{
    return vd->thread ? __run_item(vd, index) : __upload_item_find(vd, index);
}
