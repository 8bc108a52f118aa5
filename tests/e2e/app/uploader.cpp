// Uploads files by the real client, for measures: `uploader SERVICE`. Standard input has a line
// "LOCAL<TAB>SERVERPATH" per file, asked for one right after the other; a line "DONE<TAB>PATH" or "FAILED<TAB>ERROR"
// for each goes to standard output in the order of the input.
#include "base/base.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <cstdio>
#include <deque>
#include <iostream>
#include <semaphore>
#include <string>

struct File {
    int request = 0;
    int state = 0;
    int error = 0;
    std::counting_semaphore<> *ended = nullptr;
};

static void uploaded(int state, int, int, int error, void *data)
{
    auto *file = static_cast<File *>(data);
    if (state != CLOUD_CONTENT_SYNC_STATE_DONE && state != CLOUD_CONTENT_SYNC_STATE_FAILED)
        return;
    file->error = error;
    file->state = state;
    file->ended->release();
}

int main(int argc, char **argv)
{
    cloud_content_sync_h handle = nullptr;
    if (argc != 2 || cloud_content_sync_create(argv[1], &handle) != CLOUD_CONTENT_SYNC_ERROR_NONE) {
        std::fputs("usage: uploader SERVICE, which must be described\n", stderr);
        return 2;
    }
    std::counting_semaphore<> ended(0);
    std::deque<File> files;
    std::string line;
    while (std::getline(std::cin, line)) {
        const size_t tab = line.find('\t');
        if (tab == line.npos)
            continue;
        File &file = files.emplace_back();
        file.ended = &ended;
        const std::string local = line.substr(0, tab), server = line.substr(tab + 1);
        file.error = cloud_content_sync_upload(handle, local.c_str(), server.c_str(), &file.request, uploaded, &file);
        if (file.error)
            ended.release();
    }
    for (size_t i = 0; i < files.size(); i++)
        ended.acquire();
    for (const File &file : files) {
        char *path = nullptr;
        if (file.state == CLOUD_CONTENT_SYNC_STATE_DONE)
            cloud_content_sync_get_uploaded_path(handle, file.request, &path);
        const CString owned(path);
        if (file.state == CLOUD_CONTENT_SYNC_STATE_DONE)
            std::printf("DONE\t%s\n", path ? path : "");
        else
            std::printf("FAILED\t%d\n", file.error);
    }
    cloud_content_sync_destroy(handle);
    return 0;
}
