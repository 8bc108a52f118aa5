// The fake's service, and the control of the tests.
#include "fake_cloud.h"
#include "base/base.h"
#include "cloud_content_sync/names.h"
#include "fake_state.h"
#include <filesystem>
#include <fstream>

using namespace cloud;

FakeCloud &fake()
{
    static FakeCloud state;
    return state;
}

void FakeState::refresh(Account &account) const
{
    std::vector<FolderRow> folder_rows;
    std::vector<ContentRow> content_rows;
    for (const std::string &path : folders)
        if (path != "/")
            folder_rows.push_back({path, name_of(path)});
    for (const auto &[path, content] : files)
        content_rows.push_back({parent_of(path), name_of(path), static_cast<long long>(content.size()), 0, ""});
    account.replace(folder_rows, content_rows, {}, account.identity());
}

template <class Change> static void change(Change apply)
{
    {
        std::scoped_lock lock(fake().mutex);
        apply(fake());
    }
    fake().changed.notify_all();
}

void fake_cloud_reset()
{
    change([](FakeState &state) {
        if (state.handles)
            std::abort(); // a handle that was not destroyed
        state = FakeState();
    });
    std::filesystem::remove_all(cloud_data_dir());
    const std::string descriptions = cloud_data_dir() + "/services";
    std::filesystem::create_directory(descriptions);
    setenv("CLOUD_SERVICES_DIR", descriptions.c_str(), 1);
    const Credentials credentials = {"someone@example.org", "secret", "someone@example.org"};
    for (const std::string name : {"Velora", "Test"}) {
        std::ofstream(descriptions + "/" + name + ".conf") << "[Service]\nStorage=http://127.0.0.1:1/\n";
        credentials_store(name, &credentials);
    }
}

void fake_cloud_refresh_now()
{
    Account account(*service_find("Velora"));
    if (!account.open())
        std::abort();
    change([&](FakeState &state) { state.refresh(account); });
}

void fake_cloud_add_folder(const std::string &path)
{
    change([&](FakeState &state) { state.folders.insert(path); });
}

void fake_cloud_add_file(const std::string &path, const std::string &content)
{
    change([&](FakeState &state) { state.files[path] = content; });
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
    return found == fake().files.end() ? std::nullopt : std::optional(found->second);
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
    for (const auto &[path, content] : fake().files)
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

void fake_cloud_let_through(int callbacks)
{
    change([&](FakeState &state) { state.permits += callbacks; });
}

int fake_cloud_open_handles()
{
    std::scoped_lock lock(fake().mutex);
    return fake().handles;
}

std::vector<std::string> fake_cloud_upload_log()
{
    std::scoped_lock lock(fake().mutex);
    return fake().log;
}
