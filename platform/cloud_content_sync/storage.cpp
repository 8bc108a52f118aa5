#include "cloud_content_sync/storage.h"
#include "cloud_content_sync/client.h"
#include <algorithm>
#include <utility>

namespace cloud {

static constexpr char QUOTA_BODY[] = "<?xml version=\"1.0\" encoding=\"utf-8\"?>\n"
                                     "<D:propfind xmlns:D=\"DAV:\"><D:prop><D:quota-available-bytes/>"
                                     "<D:quota-used-bytes/></D:prop></D:propfind>";

Storage::Storage(Client &owner) : client(owner) {}

Storage::~Storage() = default;

void Storage::ask(cloud_content_sync_storage_cb cb, void *user_data)
{
    const int id = client.new_request();
    {
        std::scoped_lock lock(mutex);
        questions.push_back({id, cb, user_data});
    }
    client.http.wake();
}

bool Storage::cancel(void *user_data)
{
    std::vector<int> ids;
    {
        std::scoped_lock lock(mutex);
        for (const Question &one : questions)
            if (one.user_data == user_data)
                ids.push_back(one.id);
    }
    bool was_any = false;
    for (const int id : ids)
        was_any |= client.cancel(id);
    return was_any;
}

// A question stays in the list until its callback has returned, so that a cancel finds it.
void Storage::drop(int id)
{
    std::scoped_lock lock(mutex);
    std::erase_if(questions, [id](const Question &one) { return one.id == id; });
}

void Storage::step()
{
    if (running && !client.is_wanted(running->id)) {
        client.http.abort(std::exchange(transfer, nullptr));
        drop(std::exchange(running, std::nullopt)->id);
    }
    while (!running) {
        {
            std::scoped_lock lock(mutex);
            if (questions.empty())
                return;
            running = questions.front();
        }
        if (client.is_wanted(running->id))
            start();
        else
            drop(std::exchange(running, std::nullopt)->id);
    }
}

void Storage::start()
{
    Credentials credentials;
    if (const int error = credentials_load(client.service.name, credentials))
        return answer(error, 0, 0);
    auto reader = std::make_shared<MultistatusReader>(client.service.root_path);
    auto question = std::make_unique<Transfer>();
    question->method = "PROPFIND";
    question->path = "/";
    question->headers = {"Depth: 0", "Content-Type: application/xml; charset=utf-8"};
    question->body = QUOTA_BODY;
    question->write = [reader](const char *data, size_t size) { return reader->feed(data, size); };
    question->done = [this, reader](Transfer &done) {
        transfer = nullptr;
        if (done.result != CURLE_OK || done.status != 207)
            return answer(done.error() ? done.error() : CLOUD_CONTENT_SYNC_ERROR_SERVER, 0, 0);
        if (!reader->finish())
            return answer(CLOUD_CONTENT_SYNC_ERROR_SERVER, 0, 0);
        const auto root =
            std::ranges::find_if(reader->entries, [](const DavEntry &entry) { return entry.path == "/"; });
        if (root == reader->entries.end())
            return answer(CLOUD_CONTENT_SYNC_ERROR_SERVER, 0, 0);
        const auto used = static_cast<unsigned long long>(std::max(root->quota_used, 0LL));
        const auto left = static_cast<unsigned long long>(std::max(root->quota_left, 0LL));
        answer(0, root->quota_left < 0 ? 0 : used + left, used);
    };
    transfer = client.http.start(std::move(question), credentials);
}

void Storage::answer(int error, unsigned long long total, unsigned long long used)
{
    const Question question = *std::exchange(running, std::nullopt);
    if (client.begin_callback(question.id, true)) {
        question.cb(error ? CLOUD_CONTENT_SYNC_STATE_FAILED : CLOUD_CONTENT_SYNC_STATE_DONE, total, used, error,
                    question.user_data);
        client.end_callback();
    }
    drop(question.id);
}

void Storage::end(int error)
{
    client.http.abort(std::exchange(transfer, nullptr));
    std::deque<Question> all;
    {
        std::scoped_lock lock(mutex);
        all = questions;
    }
    running.reset();
    for (const Question &one : all) {
        if (!error) {
            drop(one.id);
            continue;
        }
        running = one;
        answer(error, 0, 0);
    }
}

} // namespace cloud
