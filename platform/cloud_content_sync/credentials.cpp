#include "cloud_content_sync/credentials.h"
#include "base/base.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/secrets.h"
#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <ctime>
#include <glib.h>
#include <glib/gstdio.h>
#include <mutex>
#include <sys/stat.h>

namespace cloud {

static constexpr char GROUP[] = "Credentials";

bool has_control_characters(const std::string &text)
{
    return std::any_of(text.begin(), text.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; });
}

bool email_is_valid(const std::string &email)
{
    return !email.empty() && !has_control_characters(email);
}

std::string credentials_file(const std::string &service_name)
{
    return cloud_data_dir() + "/" + service_name + ".credentials";
}

static std::optional<Credentials> read_file(const std::string &path)
{
    g_autoptr(GKeyFile) file = g_key_file_new();
    if (!g_key_file_load_from_file(file, path.c_str(), G_KEY_FILE_NONE, nullptr))
        return {};
    const auto field = [&](const char *key) -> std::string {
        g_autofree char *value = g_key_file_get_string(file, GROUP, key, nullptr);
        return value ? value : "";
    };
    Credentials credentials{field("User"), field("Secret"), field("Email"), field("SecretItem"), field("Identity")};
    if (credentials.secret.empty() && credentials.item.empty())
        return {};
    return credentials;
}

// What was read last is taken again while the file is the same one: every change makes a new one. The clock of files
// may stand still for some milliseconds, so a young file is always read.
std::optional<Credentials> credentials_known(const std::string &service_name)
{
    static std::mutex mutex;
    static struct {
        std::string path;
        struct stat file = {};
        std::optional<Credentials> credentials;
    } last;
    const std::string path = platform_data_dir() + "/cloud/" + service_name + ".credentials"; // nothing is made for it
    std::scoped_lock lock(mutex);
    struct stat now = {};
    if (stat(path.c_str(), &now) != 0) {
        last = {};
        return {};
    }
    const auto is_same = [](const timespec &one, const timespec &other) {
        return one.tv_sec == other.tv_sec && one.tv_nsec == other.tv_nsec;
    };
    const bool is_known = last.path == path && last.file.st_ino == now.st_ino && last.file.st_dev == now.st_dev &&
                          last.file.st_size == now.st_size && is_same(last.file.st_mtim, now.st_mtim) &&
                          is_same(last.file.st_ctim, now.st_ctim);
    if (!is_known || std::abs(time(nullptr) - now.st_ctim.tv_sec) < 2)
        last = {path, now, read_file(path)};
    return last.credentials;
}

int credentials_load(const std::string &service_name, Credentials &credentials)
{
    // The item is removed when others take the place of these credentials: then the file is another one by now.
    std::string missing;
    for (;;) {
        auto known = credentials_known(service_name);
        if (!known)
            return CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
        if (known->secret.empty() && known->item == missing)
            return CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED;
        if (known->secret.empty())
            known->secret = secret_find(credentials_file(service_name), known->item);
        missing = known->item;
        if (known->secret.empty())
            continue;
        credentials = std::move(*known);
        return CLOUD_CONTENT_SYNC_ERROR_NONE;
    }
}

bool credentials_store(const std::string &service_name, const Credentials *credentials)
{
    const std::string path = credentials_file(service_name);
    if (!credentials)
        return g_unlink(path.c_str()) == 0 || errno == ENOENT;
    g_autoptr(GKeyFile) file = g_key_file_new();
    const auto put = [&](const char *key, const std::string &value) {
        if (!value.empty())
            g_key_file_set_string(file, GROUP, key, value.c_str());
    };
    put("User", credentials->user);
    put("Email", credentials->email);
    put("Secret", credentials->item.empty() ? credentials->secret : "");
    put("SecretItem", credentials->item);
    put("Identity", credentials->identity);
    gsize size = 0;
    g_autofree char *data = g_key_file_to_data(file, &size, nullptr);
    // The mode is that of a new file; an existing one is replaced by a new one.
    return g_file_set_contents_full(
               path.c_str(), data, static_cast<gssize>(size),
               static_cast<GFileSetContentsFlags>(G_FILE_SET_CONTENTS_CONSISTENT | G_FILE_SET_CONTENTS_DURABLE), 0600,
               nullptr) != FALSE;
}

std::string account_identity(const Service &service, const Credentials &credentials)
{
    if (!credentials.identity.empty())
        return credentials.identity;
    // A bearer token says nothing about its user: where it is all that is known, another token is another account.
    const std::string who = !credentials.email.empty()  ? "email\n" + credentials.email
                            : !credentials.user.empty() ? "user\n" + credentials.user
                                                        : "bearer\n" + credentials.secret;
    const std::string text = service.storage + "\n" + who;
    g_autofree char *digest =
        g_compute_checksum_for_string(G_CHECKSUM_SHA256, text.data(), static_cast<gssize>(text.size()));
    return digest;
}

} // namespace cloud
