// Whoever cancels an upload is not kept waiting, and neither is the next one, whatever the first was at.
#include "scripted_server.h"
#include <cstdlib>
#include <future>

namespace {

constexpr size_t BIG = 16 << 20;

struct State {
    const char *what;
    Names answers;        // to the requests of the upload, in turn; the last one again and again
    size_t held;          // the answer to this request is held back until the end; counts from 1
    bool is_at_head;      // not even its body is taken
    bool cancels_waiting; // cancelled when the client says that it waits, not at a request
    std::optional<cloud::Way> way = cloud::Way::CONDITION;
    std::optional<int> digest = {};
    size_t size = 5;
};

class Cancel : public Scripted {
  protected:
    int uploads = 0; // each of another file: a server may get the port of an earlier one, and the book knows that one's

    // Milliseconds from the cancel until the next upload has begun.
    long long once(const State &state)
    {
        way = state.way;
        std::promise<void> is_held, end;
        const auto ended = end.get_future().share();
        std::atomic<size_t> heads = 0, requests = 0;
        serve(
            [&](const Request &request) -> std::string {
                if (request.path.ends_with("/next"))
                    return answer("403 Forbidden");
                return state.answers[std::min(requests.load(), state.answers.size()) - 1];
            },
            60, 300);
        if (state.digest) {
            cloud_content_sync_destroy(std::exchange(handle, nullptr));
            cloud::Known(*cloud::service_find("Test")).remember("digest", *state.digest);
            EXPECT_EQ(cloud_content_sync_create("Test", &handle), 0);
        }
        const auto hold = [&](const Request &request, std::atomic<size_t> &count, bool is_head) {
            if (request.path.ends_with("/next") || ++count != state.held || state.is_at_head != is_head)
                return;
            is_held.set_value();
            ended.wait();
        };
        server->set_head_hook([&](const Request &request) { hold(request, heads, true); });
        server->set_hook([&](const Request &request) { hold(request, requests, false); });
        Watch first, next;
        const int id =
            start(handle, scratch.file("local" + std::to_string(++uploads), some_bytes(state.size, 1)), "/x", first);
        if (state.cancels_waiting)
            wait_until([&] {
                cloud_content_sync_wait_e reason = CLOUD_CONTENT_SYNC_WAIT_NONE;
                int seconds = 0;
                return cloud_content_sync_get_wait(handle, &reason, &seconds) == 0 && reason != 0;
            });
        else
            is_held.get_future().wait();
        start(handle, scratch.file("small", "small"), "/next", next);
        const auto begun = std::chrono::steady_clock::now();
        EXPECT_EQ(cloud_content_sync_cancel(handle, id), 0);
        EXPECT_TRUE(next.wait([](const auto &calls) { return !calls.empty(); }));
        const auto taken = std::chrono::steady_clock::now() - begun;
        end.set_value();
        TearDown();
        return std::chrono::duration_cast<std::chrono::milliseconds>(taken).count();
    }
    static void wait_until(const std::function<bool()> &condition)
    {
        while (!condition())
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
};

} // namespace

// How often, in all: $CANCEL_ROUNDS times the table.
TEST_F(Cancel, the_next_upload_begins_at_once)
{
    const std::string created = answer("201 Created"), taken = answer("412 Taken"), none = answer("404 Not Found"),
                      fine = answer("204 Fine"), lost, there = multistatus(file("/r%20t/x"));
    const std::string busy = answer("503 Busy", "", "Retry-After: 30\r\n");
    constexpr auto MOVE = cloud::Way::MOVE;
    const State states[] = {
        {"probes, first file", {created}, 1, false, false, {}},
        {"probes, deletes its files", {created, taken, created}, 3, false, false, {}},
        {"sends, nothing is taken", {created}, 1, true, false, cloud::Way::CONDITION, {}, BIG},
        {"waits for the answer", {created}, 1, false, false},
        {"looks after a lost answer", {lost, none}, 2, false, false},
        {"looks for a free name", {taken, none}, 2, false, false},
        {"looks at what is stored", {created, there}, 2, false, false},
        {"looks at what is stored, by HEAD", {created, there}, 2, false, false, cloud::Way::CONDITION, 0},
        {"reads it back", {created, there, created}, 3, false, false},
        {"sends to a temporary name", {created}, 1, true, false, MOVE, {}, BIG},
        {"moves", {created, there, answer("200 OK", "hello"), created}, 4, false, false, MOVE},
        {"deletes a temporary name", {answer("403 Forbidden"), fine}, 2, false, false, MOVE},
        {"waits for a busy service", {busy}, 0, false, true},
        {"waits for one that cannot be reached", {lost, lost, lost}, 0, false, true},
    };
    const char *wanted = std::getenv("CANCEL_ROUNDS");
    for (int round = 0, rounds = wanted ? std::atoi(wanted) : 2; round < rounds; round++)
        for (const State &state : states)
            EXPECT_LT(once(state), 500) << state.what;
}
