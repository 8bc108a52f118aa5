// Pipes between threads and the main loop.
#include "driver.h"
#include "temp_home.h"
#include "velora_common/velora_pipe.h"
#include <gtest/gtest.h>

#include <atomic>
#include <cstdio>
#include <map>
#include <thread>
#include <unistd.h>
#include <vector>

namespace {

class Pipe : public testing::Test {
  protected:
    void SetUp() override
    {
        ecore_init();
        alarm(60); // a send that waits for its own reader would wait forever
    }
    void TearDown() override
    {
        _velora_common_pipe_del(pipe);
        alarm(0);
        ecore_shutdown();
    }

    void open(std::function<void(const std::string &)> handler)
    {
        handle = std::move(handler);
        pipe = _velora_common_pipe_add(
            [](void *data, void *buffer, unsigned size) {
                static_cast<Pipe *>(data)->handle(std::string(static_cast<char *>(buffer), size));
            },
            this);
        ASSERT_NE(pipe, nullptr);
    }
    bool send(const std::string &message) // with its final NUL
    {
        return _velora_common_pipe_send(pipe, message.c_str(), message.size() + 1);
    }

    Ecore_Pipe *pipe = nullptr;
    std::function<void(const std::string &)> handle;
    LogCatcher log;
};

// "WRITER SEQUENCE filler", of a length that changes from one message to the next.
std::string numbered(int writer, int sequence)
{
    return std::to_string(writer) + " " + std::to_string(sequence) + " " +
           std::string(static_cast<size_t>(sequence * 7 % 300), static_cast<char>('a' + writer));
}

} // namespace

TEST_F(Pipe, KeepsEveryMessageOfEveryWriterWholeAndInOrder)
{
    constexpr int writers = 4, each = 10000; // the last writer is the main loop
    std::map<int, int> next;
    int wrong = 0, received = 0;
    open([&](const std::string &message) {
        int writer = -1, sequence = -1;
        std::sscanf(message.c_str(), "%d %d", &writer, &sequence);
        const std::string expected = numbered(writer, sequence);
        wrong += message != std::string(expected.c_str(), expected.size() + 1) || next[writer]++ != sequence;
        received++;
    });
    std::vector<std::thread> threads;
    for (int writer = 0; writer + 1 < writers; writer++)
        threads.emplace_back([this, writer] {
            for (int i = 0; i < each; i++)
                send(numbered(writer, i));
        });
    int sent = 0;
    EXPECT_TRUE(driver::run_until(
        [&] {
            for (int burst = 0; burst < 200 && sent < each; burst++)
                send(numbered(writers - 1, sent++));
            return received == writers * each;
        },
        50));
    for (std::thread &thread : threads)
        thread.join();
    EXPECT_EQ(received, writers * each);
    EXPECT_EQ(wrong, 0);
}

TEST_F(Pipe, NeverWaitsForItsOwnReader)
{
    constexpr int count = 5000; // five megabytes, far more than the kernel takes
    int received = 0;
    open([&](const std::string &message) {
        EXPECT_EQ(message, std::to_string(received) + std::string(1000, '.') + '\0');
        received++;
    });
    for (int i = 0; i < count; i++)
        ASSERT_TRUE(send(std::to_string(i) + std::string(1000, '.')));
    EXPECT_TRUE(driver::run_until([&] { return received == count; }));
    EXPECT_FALSE(send(std::string(1024, '.'))) << "longer than a message may be, with its NUL";
}

TEST_F(Pipe, TheLastUpdateIsAlwaysSeen)
{
    constexpr int changes = 50000;
    std::atomic<int> value = 0;
    int seen = 0;
    open([&](const std::string &) { seen = value; });
    std::thread writer([&] {
        for (int i = 1; i <= changes; i++) {
            value = i;
            send("update.0");
        }
    });
    EXPECT_TRUE(driver::run_until([&] { return seen == changes; }, 20)) << seen;
    writer.join();
}

TEST_F(Pipe, GoesAwayInItsHandlerWithMessagesUnread)
{
    int received = 0;
    open([&](const std::string &) {
        received++;
        _velora_common_pipe_del(std::exchange(pipe, nullptr));
    });
    for (int i = 0; i < 200; i++)
        send(std::string(500, 'x'));
    Ecore_Pipe *gone = pipe;
    driver::run_until([&] { return received > 1; }, 0.2);
    EXPECT_EQ(received, 1);
    EXPECT_FALSE(_velora_common_pipe_send(gone, "late", 5));
    _velora_common_pipe_send_msg(gone, "late");
    _velora_common_pipe_send_msg(nullptr, "nobody");
    _velora_common_pipe_del(gone); // a second time: nothing
}
