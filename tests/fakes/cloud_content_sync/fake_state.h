#pragma once
// The service of the fake, and what it is told to do. One lock guards everything, the clients too.
#include "cloud_content_sync/client.h"
#include <functional>

struct FakeState {
    std::set<std::string> folders = {"/"};
    std::map<std::string, std::string> files; // path -> content
    bool reachable = true, held = false;
    int permits = 0, delay = 0, uploads_sent = 0, refresh_error = 0, create_error = 0, content_error = 0, handles = 0;
    std::map<int, int> upload_errors; // number of the upload -> error
    std::vector<std::string> log;
    std::map<std::string, std::string> cached; // path -> content of the cached file
    std::map<const cloud::Client *, std::deque<std::function<void()>>> jobs;
    std::map<std::pair<const cloud::Client *, int>, std::string> landed;

    // Writes the tree into a client's database.
    void refresh(cloud::Account &account) const;
};

struct FakeCloud : FakeState {
    std::mutex mutex;
    std::condition_variable changed;
};
FakeCloud &fake();
