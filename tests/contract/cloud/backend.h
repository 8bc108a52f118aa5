#pragma once
// What the contract of the cloud client is tried against: WebDAV servers, or the fake library.
#include "transfers.h"
#include <memory>
#include <optional>

class Relay;

struct Backend {
    Names taboo = {};           // names that it refuses
    std::string media_url = {}; // of the account interface that gives thumbnails, and addresses to stream from

    std::function<void(const std::string &path)> make_folder = {}, remove = {};
    std::function<void(const std::string &path, const std::string &bytes)> store = {};
    std::function<std::optional<std::string>(const std::string &path)> content = {};
    std::function<Names(const std::string &folder)> list = {}; // unsorted
    std::function<void()> go_down = {};                        // from now on the service cannot be reached
    // For clients that are created from now on, and destroyed before it.
    std::function<std::shared_ptr<Relay>()> put_relay_between = {};
    // Of a service with pages: USER signs in there and allows the request token; whether an access token is alive.
    std::function<void(const std::string &token)> approve = {};
    std::function<bool(const std::string &access)> is_alive = {};
    std::vector<std::shared_ptr<void>> owned = {};
};

// Who is signed in.
inline constexpr char USER[] = "someone@example.org", PASSWORD[] = "a secret: with colon";

// The backends of this program; each is started with an empty tree, its service is called "Test", and somebody is
// signed in to it. Nothing when it does not start.
Names backend_names();
// Those of them that are services on the network, for what the fake does not do.
Names server_names();
// Those that have pages to sign in.
Names page_names();
std::optional<Backend> start_backend(const std::string &name);

// A backend and a client of it.
class OnBackend : public testing::TestWithParam<std::string> {
  protected:
    void TearDown() override
    {
        if (handle)
            cloud_content_sync_destroy(handle);
        handle = nullptr;
    }
    bool open()
    {
        backend = start_backend(GetParam());
        if (backend) {
            EXPECT_EQ(cloud_content_sync_create("Test", &handle), 0);
        }
        return backend && handle;
    }

    const int file_alone = setenv("CLOUD_SECRETS", "file", 1); // no keyring of whoever runs the tests
    TempHome home;                                             // the client's
    TempFolder scratch;                                        // for local files
    std::optional<Backend> backend;
    cloud_content_sync_h handle = nullptr;
};
