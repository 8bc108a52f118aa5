#pragma once
// Control of the fake cloud client: a library with the same header as the real one, whose service is a tree in memory.
// What the application calls is cloud_content_sync.h; what a test calls is this. All functions may be called from any
// thread. Every service name is known, and all names share one tree and one database.
#include <optional>
#include <string>
#include <vector>

// Empty tree, empty database without a whole refresh, somebody signed in, the service reachable, nothing scripted and
// no waiting. To be called while no handle is open.
void fake_cloud_reset();

// The tree of the service. Parents must exist; content is replaced when it is there. The database of the client knows
// of it after the next refresh.
void fake_cloud_add_folder(const std::string &path);
void fake_cloud_add_file(const std::string &path, const std::string &content);
// With everything below it.
void fake_cloud_remove(const std::string &path);
std::optional<std::string> fake_cloud_content(const std::string &path);
// Names of the folders and files directly below a folder.
std::vector<std::string> fake_cloud_list(const std::string &folder);
// Makes the database what a refresh would, at once: for tests that begin with a refreshed account.
void fake_cloud_refresh_now();

// false: requests end with NETWORK, or with NO_ACCOUNT.
void fake_cloud_set_reachable(bool reachable);
void fake_cloud_set_signed_in(bool signed_in);

// The nth upload that reaches the service from now on (1: the next one) ends with this error after its progress.
void fake_cloud_fail_upload(int nth, int error);
// The next refresh ends with this error; the next cloud_content_sync_create answers it.
void fake_cloud_fail_refresh(int error);
void fake_cloud_fail_create(int error);

// The percentages that an upload reports on its way; 0, 50 and 100 at first.
void fake_cloud_set_percentages(const std::vector<int> &percentages);
// Requests about single files: the next one ends with this error.
void fake_cloud_fail_content(int error);
// The service makes this picture, a file, the thumbnail of the file at `path`: the client has it once it was asked for.
void fake_cloud_add_thumbnail(const std::string &path, const std::string &picture);

// A pause before each callback of an upload, in milliseconds.
void fake_cloud_set_delay(int milliseconds);
// While held, nothing calls back, except for as many callbacks as are let through.
void fake_cloud_hold(bool hold);
void fake_cloud_let_through(int callbacks);

// Handles that are created and not yet destroyed; uploads asked for since the reset, as "LOCAL -> SERVER".
int fake_cloud_open_handles();
std::vector<std::string> fake_cloud_upload_log();
