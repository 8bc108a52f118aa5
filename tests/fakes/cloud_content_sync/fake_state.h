#pragma once
// The service of the fake, and what it is told to do. One lock guards everything.
#include "cloud_content_sync/http.h"
#include <condition_variable>
#include <mutex>
#include <set>

struct FakeFile {
    std::string content, etag;
};

struct FakeState {
    std::set<std::string> folders = {"/"};
    std::map<std::string, FakeFile> files; // by path
    bool reachable = true, held = false;
    int permits = 0, delay = 0, versions = 0, uploads_sent = 0, refresh_error = 0, create_error = 0, content_error = 0;
    int storage_error = 0;
    unsigned long long storage_total = 15ULL << 30, storage_used = 0;
    std::map<int, int> upload_errors; // number of the upload -> error
    std::vector<std::string> log;
    std::map<std::string, std::string> request_tokens; // token -> secret
    std::set<std::string> access_tokens;
    std::string approver;           // the address of who allows all request tokens; empty: nobody does
    std::map<int, int> auth_errors; // number of the request -> error
    int auth_requests = 0, tokens_made = 0;

    bool exists(const std::string &path) const
    {
        return files.count(path) || folders.count(path);
    }
    void store(const std::string &path, std::string content)
    {
        files[path] = {std::move(content), "\"" + std::to_string(++versions) + "\""};
    }
};

struct FakeClient {
    std::vector<cloud::Transfer *> requests; // in the order of their starts
    std::map<const cloud::Transfer *, std::string> bearers;
    bool is_woken = false;
};

struct FakeCloud : FakeState {
    std::mutex mutex;
    std::condition_variable changed;
    std::map<const cloud::Http *, FakeClient> clients;
};
FakeCloud &fake();

// Answers of the fake, with the lock held.
bool is_auth(const cloud::Transfer &transfer);
void answer(cloud::Transfer &transfer, long status, const std::string &body);
void answer_error(cloud::Transfer &transfer, int error);
// A request of a sign-in.
void answer_auth(cloud::Transfer &transfer, const std::string &bearer);
