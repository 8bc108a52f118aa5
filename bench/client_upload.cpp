// Uploads files by the cloud client alone, one after the other, as the application does.
// usage: client_upload SERVICE FOLDER FILE...     FOLDER: a server path
#include "cloud_content_sync/cloud_content_sync.h"
#include <cstdio>
#include <future>
#include <string>

static void transfer_cb(int state, int, int, int error, void *data)
{
    if (state == CLOUD_CONTENT_SYNC_STATE_DONE || state == CLOUD_CONTENT_SYNC_STATE_FAILED)
        static_cast<std::promise<int> *>(data)->set_value(error);
}

int main(int argc, char **argv)
{
    cloud_content_sync_h handle = nullptr;
    if (argc < 4 || cloud_content_sync_create(argv[1], &handle) != 0) {
        std::fprintf(stderr, "usage: client_upload SERVICE FOLDER FILE...\n");
        return 2;
    }
    int failed = 0;
    for (int i = 3; i < argc && !failed; i++) {
        const std::string file = argv[i], target = argv[2] + file.substr(file.rfind('/'));
        std::promise<int> ended;
        int id = 0;
        failed = cloud_content_sync_upload(handle, file.c_str(), target.c_str(), &id, transfer_cb, &ended);
        if (!failed)
            failed = ended.get_future().get();
    }
    cloud_content_sync_destroy(handle);
    if (failed)
        std::fprintf(stderr, "error %d\n", failed);
    return failed ? 1 : 0;
}
