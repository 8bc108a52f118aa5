#pragma once
// What the fake's sources share. One lock guards everything.
#include "cloud_content_sync/cloud_content_sync.h"
#include <condition_variable>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

struct Job {
    enum Kind { TRANSFER, CACHED_FILE, DOWNLOAD, STREAMING_ADDRESS, THUMBNAIL };
    int id = 0; // 0: a refresh or a thumbnail
    std::string local = {}, server = {};
    cloud_content_sync_transfer_cb transfer_cb = nullptr;
    cloud_content_sync_refresh_cb refresh_cb = nullptr;
    void *user_data = nullptr;
    Kind kind = TRANSFER;
    cloud_content_sync_result_cb result_cb = nullptr;
    int status = 200; // of HTTP
};

struct FakeCloud {
    std::mutex mutex;
    std::condition_variable changed;
    std::set<std::string> folders = {"/"};
    std::map<std::string, std::string> files;     // path -> content
    std::set<std::string> known_folders = {"/"};  // the client's database
    std::map<std::string, long long> known_files; // path -> size
    std::map<int, bool> activation;
    bool complete = false, reachable = true, signed_in = true, held = false;
    int permits = 0, delay = 0, uploads_sent = 0, refresh_error = 0, create_error = 0, content_error = 0, handles = 0;
    std::map<int, int> upload_errors; // number of the upload -> error
    std::vector<int> percentages = {0, 50, 100};
    std::vector<std::string> log;
    std::map<std::string, std::string> cached;     // path -> content of the cached file
    std::map<std::string, std::string> thumbnails; // path -> file
    std::set<std::string> fetched_thumbnails;      // paths

    void refresh(); // with the lock held
};
FakeCloud &fake();

// One handle. Jobs run one after the other on its thread.
class FakeClient : public std::enable_shared_from_this<FakeClient> {
  public:
    void start();
    void stop();
    // A job whose id is not 0 is an upload; *id is its number, written before it can call back.
    void add(Job job, int *id = nullptr);
    bool cancel(int id);
    void set_thumbnail_cb(cloud_content_sync_thumbnail_cb cb, void *user_data);

    std::map<int, std::string> landed;

  private:
    void loop();
    void run_upload(const Job &job);
    void run_refresh(const Job &job);
    void run_content(Job job);
    void run_thumbnail(const Job &job);
    bool is_wanted(const Job &job) const
    {
        return !stopping && (job.id == 0 || live.count(job.id));
    }
    // False when the job is not wanted any more. `commit` runs, with the lock held, once the callback is certain.
    bool call(const Job &job, int state, int progress, int error, const std::function<void()> &commit = {});

    bool stopping = false;
    int last_id = 0, calling = 0; // -1: a thumbnail
    cloud_content_sync_thumbnail_cb thumbnail_cb = nullptr;
    void *thumbnail_data = nullptr;
    std::set<int> live;
    std::deque<Job> jobs;
    std::thread thread;
    std::thread::id thread_id;
};

struct cloud_content_sync_s {
    std::shared_ptr<FakeClient> client;
    std::string service;
};
struct cloud_content_sync_content_s {
    std::string path;
    long long size;
    std::weak_ptr<FakeClient> client;
};
int give(const std::string &text, char **out);
