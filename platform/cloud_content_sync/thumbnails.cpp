#include "cloud_content_sync/thumbnails.h"
#include "cloud_content_sync/cache.h"
#include "cloud_content_sync/client.h"
#include "cloud_content_sync/fetch.h"
#include "cloud_content_sync/names.h"
#include <algorithm>

namespace cloud {

static constexpr size_t AT_ONCE = 2;
static constexpr size_t WAITING_MOST = 200;
static constexpr int PIXELS = 256; // of the square that a thumbnail fits in
static constexpr long long THUMBNAIL_BYTES = 2 << 20;
static constexpr long long CACHE_BYTES = 64 << 20;
static constexpr unsigned TRIM_EVERY = 64; // looking through the folder takes longer than storing a thumbnail
// A service that cannot be reached is not asked for the next picture at once.
static constexpr auto PAUSE = std::chrono::seconds(30);

struct Thumbnails::Running {
    Wish wish;
    std::unique_ptr<Fetch> fetch;
    bool ended = false;
};

Thumbnails::Thumbnails(Client &owner) : client(owner) {}

Thumbnails::~Thumbnails() = default;

// Empty when nobody is signed in.
std::string Thumbnails::file_of(const ContentRow &row) const
{
    const std::string who = client.account->identity();
    return who.empty() ? "" : cache_file(Kept::THUMBNAIL, client.service.name, who, row);
}

std::optional<std::string> Thumbnails::find(const ContentRow &row)
{
    std::string file = file_of(row);
    return !file.empty() && cache_use(file, -1) ? std::optional(std::move(file)) : std::nullopt;
}

void Thumbnails::want(const ContentRow &row)
{
    if (client.service.api.empty() || content_type_of(row.name) != CLOUD_CONTENT_TYPE_IMAGE)
        return;
    Wish wish{row, file_of(row)};
    {
        std::scoped_lock lock(mutex);
        if (wish.file.empty() || failed.count(wish.file) || underway.count(wish.file))
            return;
        std::erase_if(waiting, [&](const Wish &other) { return other.file == wish.file; });
        waiting.push_front(std::move(wish));
        if (waiting.size() > WAITING_MOST)
            waiting.pop_back();
    }
    client.http.wake();
}

void Thumbnails::set_cb(cloud_content_sync_thumbnail_cb new_cb, void *user_data)
{
    std::unique_lock lock(mutex);
    cb = new_cb;
    cb_data = user_data;
    if (!client.on_own_thread())
        callback_ended.wait(lock, [&] { return !is_calling; });
}

void Thumbnails::step(bool may_start)
{
    std::erase_if(running, [](const auto &one) { return one->ended; });
    while (may_start && running.size() < AT_ONCE && std::chrono::steady_clock::now() >= pause_end) {
        Wish next;
        {
            std::scoped_lock lock(mutex);
            if (waiting.empty())
                return;
            next = std::move(waiting.front());
            waiting.pop_front();
            underway.insert(next.file);
        }
        const std::string file = next.file;
        if (start(std::move(next)))
            continue;
        std::scoped_lock lock(mutex);
        underway.erase(file);
    }
}

bool Thumbnails::start(Wish wish)
{
    Credentials credentials;
    // Somebody else may have signed in since it was asked for.
    if (file_of(wish.row) != wish.file || credentials_load(client.service.name, credentials))
        return false;
    auto one = std::make_unique<Running>();
    one->fetch =
        std::make_unique<Fetch>(client.http, cache_folder(Kept::THUMBNAIL, client.service.name), 0600, THUMBNAIL_BYTES);
    one->wish = std::move(wish);
    auto transfer = std::make_unique<Transfer>();
    transfer->url = client.service.api + "/1/thumbnail?size=" + std::to_string(PIXELS) +
                    "&path=" + percent_encode(join(one->wish.row.parent, one->wish.row.name));
    Running &borrowed = *one;
    if (!one->fetch->start(std::move(transfer), credentials, [this, &borrowed] { fetched(borrowed); }))
        return false;
    running.push_back(std::move(one));
    return true;
}

void Thumbnails::fetched(Running &one)
{
    const int error = one.fetch->error;
    const bool is_there =
        !error && one.fetch->size > 0 && file_of(one.wish.row) == one.wish.file && one.fetch->store(one.wish.file);
    one.ended = true;
    {
        std::scoped_lock lock(mutex);
        underway.erase(one.wish.file);
        if (error == CLOUD_CONTENT_SYNC_ERROR_NETWORK || error == CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED) {
            // It says nothing about the picture; rows ask again when they come into sight.
            waiting.clear();
            pause_end = std::chrono::steady_clock::now() + PAUSE;
        } else if (!is_there) {
            failed.insert(one.wish.file);
        }
    }
    if (is_there && stored++ % TRIM_EVERY == 0)
        cache_trim(cache_folder(Kept::THUMBNAIL, client.service.name), CACHE_BYTES, one.wish.file);
    if (is_there)
        report(one.wish.row);
    client.http.wake();
}

void Thumbnails::report(const ContentRow &row)
{
    cloud_content_sync_thumbnail_cb to_call = nullptr;
    void *data = nullptr;
    {
        std::scoped_lock lock(mutex);
        if (!cb || client.is_stopping())
            return;
        to_call = cb;
        data = cb_data;
        is_calling = true;
    }
    to_call(join(row.parent, row.name).c_str(), data);
    {
        std::scoped_lock lock(mutex);
        is_calling = false;
    }
    callback_ended.notify_all();
}

void Thumbnails::end()
{
    running.clear();
    std::scoped_lock lock(mutex);
    waiting.clear();
    underway.clear();
    failed.clear();
}

} // namespace cloud
