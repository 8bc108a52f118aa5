// The fake's service, and the control of the tests.
#include "fake_cloud.h"
#include "base/base.h"
#include "cloud_content_sync/account.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/names.h"
#include "fake_state.h"
#include <filesystem>
#include <fstream>
#include <utility>

using namespace cloud;

template <class Change> static void change(Change apply)
{
    {
        std::scoped_lock lock(fake().mutex);
        apply(fake());
    }
    fake().changed.notify_all();
}

// The library's own two are compiled under other names.
#undef cloud_content_sync_create
#undef cloud_content_sync_upload
int real_cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle);
int real_cloud_content_sync_upload(cloud_content_sync_h handle, const char *local_path, const char *server_path,
                                   int *req_id, cloud_content_sync_transfer_cb cb, void *user_data);

int cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle)
{
    std::unique_lock lock(fake().mutex);
    if (const int error = std::exchange(fake().create_error, 0))
        return error;
    lock.unlock();
    return real_cloud_content_sync_create(service_name, handle);
}

int cloud_content_sync_upload(cloud_content_sync_h handle, const char *local_path, const char *server_path, int *req_id,
                              cloud_content_sync_transfer_cb cb, void *user_data)
{
    change([&](FakeState &state) { state.log.push_back(std::string(local_path) + " -> " + server_path); });
    return real_cloud_content_sync_upload(handle, local_path, server_path, req_id, cb, user_data);
}

void fake_cloud_reset()
{
    {
        // A client that was destroyed from within its callback may need a moment.
        std::unique_lock lock(fake().mutex);
        if (!fake().changed.wait_for(lock, std::chrono::seconds(10), [] { return fake().clients.empty(); }))
            std::abort(); // a handle that was not destroyed
    }
    change([](FakeState &state) { state = FakeState(); });
    std::filesystem::remove_all(cloud_data_dir());
    const std::string descriptions = cloud_data_dir() + "/services";
    std::filesystem::create_directory(descriptions);
    setenv("CLOUD_SERVICES_DIR", descriptions.c_str(), 1);
    setenv("CLOUD_SECRETS", "file", 1);
    const Credentials credentials = {"someone@example.org", "secret", "someone@example.org"};
    for (const std::string name : {"Velora", "Test"}) {
        std::ofstream(descriptions + "/" + name + ".conf")
            << "[Service]\nStorage=http://127.0.0.1:1/\nApi=http://127.0.0.1:1\nWeb=https://"
               "velora.example.org\nWaitLimit=0\n";
        credentials_store(name, &credentials);
    }
}

void fake_cloud_refresh_now()
{
    Account account(*service_find("Velora"));
    if (!account.open())
        std::abort();
    std::vector<FolderRow> folders;
    std::vector<ContentRow> contents;
    change([&](FakeState &state) {
        for (const std::string &path : state.folders)
            if (path != "/")
                folders.push_back({path, name_of(path)});
        for (const auto &[path, file] : state.files)
            contents.push_back(
                {parent_of(path), name_of(path), static_cast<long long>(file.content.size()), 0, file.etag});
    });
    account.replace(folders, contents, {}, account.identity());
}

void fake_cloud_add_folder(const std::string &path)
{
    change([&](FakeState &state) { state.folders.insert(path); });
}

void fake_cloud_add_file(const std::string &path, const std::string &content)
{
    change([&](FakeState &state) { state.store(path, content); });
}

void fake_cloud_remove(const std::string &path)
{
    const auto is_below = [&](const std::string &other) { return (other + "/").starts_with(path + "/"); };
    change([&](FakeState &state) {
        std::erase_if(state.folders, is_below);
        std::erase_if(state.files, [&](const auto &file) { return is_below(file.first); });
    });
}

std::optional<std::string> fake_cloud_content(const std::string &path)
{
    std::scoped_lock lock(fake().mutex);
    const auto found = fake().files.find(path);
    return found == fake().files.end() ? std::nullopt : std::optional(found->second.content);
}

std::vector<std::string> fake_cloud_list(const std::string &folder)
{
    std::scoped_lock lock(fake().mutex);
    std::vector<std::string> names;
    const auto add = [&](const std::string &path) {
        if (path != "/" && parent_of(path) == folder)
            names.push_back(name_of(path));
    };
    for (const std::string &path : fake().folders)
        add(path);
    for (const auto &[path, file] : fake().files)
        add(path);
    return names;
}

void fake_cloud_set_reachable(bool reachable)
{
    change([&](FakeState &state) { state.reachable = reachable; });
}

void fake_cloud_fail_upload(int nth, int error)
{
    change([&](FakeState &state) { state.upload_errors[state.uploads_sent + nth] = error; });
}

void fake_cloud_fail_refresh(int error)
{
    change([&](FakeState &state) { state.refresh_error = error; });
}

void fake_cloud_fail_create(int error)
{
    change([&](FakeState &state) { state.create_error = error; });
}

void fake_cloud_fail_content(int error)
{
    change([&](FakeState &state) { state.content_error = error; });
}

void fake_cloud_set_storage(unsigned long long total, unsigned long long used, int error)
{
    change([&](FakeState &state) {
        state.storage_total = total;
        state.storage_used = used;
        state.storage_error = error;
    });
}

void fake_cloud_approve(const std::string &email)
{
    change([&](FakeState &state) { state.approver = email; });
}

void fake_cloud_sign_in(const std::string &email)
{
    Credentials credentials;
    change([&](FakeState &state) {
        credentials = {"", "access" + std::to_string(++state.tokens_made), email};
        if (!email.empty())
            state.access_tokens.insert(credentials.secret);
    });
    for (const char *name : {"Velora", "Test"})
        credentials_store(name, email.empty() ? nullptr : &credentials);
}

void fake_cloud_revoke_tokens()
{
    change([](FakeState &state) { state.access_tokens.clear(); });
}

bool fake_cloud_token_is_alive(const std::string &token)
{
    std::scoped_lock lock(fake().mutex);
    return fake().access_tokens.count(token) > 0;
}

int fake_cloud_live_tokens()
{
    std::scoped_lock lock(fake().mutex);
    return static_cast<int>(fake().access_tokens.size());
}

void fake_cloud_fail_auth(int nth, int error)
{
    change([&](FakeState &state) { state.auth_errors[state.auth_requests + nth] = error; });
}

void fake_cloud_set_delay(int milliseconds)
{
    change([&](FakeState &state) { state.delay = milliseconds; });
}

void fake_cloud_hold(bool hold)
{
    change([&](FakeState &state) {
        state.held = hold;
        state.permits = 0;
    });
}

void fake_cloud_let_through(int steps)
{
    change([&](FakeState &state) { state.permits += steps; });
}

int fake_cloud_open_handles()
{
    std::scoped_lock lock(fake().mutex);
    return static_cast<int>(fake().clients.size());
}

std::vector<std::string> fake_cloud_upload_log()
{
    std::scoped_lock lock(fake().mutex);
    return fake().log;
}
