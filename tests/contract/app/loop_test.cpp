// GLib's sources on the Ecore main loop.
#include "app/glib_loop.h"
#include "driver.h"
#include <Ecore.h>
#include <functional>
#include <glib-unix.h>
#include <gtest/gtest.h>
#include <thread>
#include <unistd.h>

namespace {
int waits = 0; // how often Ecore went to wait
Ecore_Select_Function bridge = nullptr;

int counting(int n, fd_set *r, fd_set *w, fd_set *x, timeval *t)
{
    waits++;
    return bridge(n, r, w, x, t);
}

class Loop : public testing::Test {
  protected:
    static void SetUpTestSuite()
    {
        driver::start();
    }
    void SetUp() override
    {
        glib_loop_start();
        bridge = ecore_main_loop_select_func_get();
        ecore_main_loop_select_func_set(counting);
        waits = 0;
    }
    void TearDown() override
    {
        ecore_main_loop_select_func_set(bridge);
        glib_loop_stop();
    }
};

Eina_Bool quit(void *)
{
    ecore_main_loop_quit();
    return ECORE_CALLBACK_CANCEL;
}

void run(double seconds)
{
    ecore_timer_add(seconds, quit, nullptr);
    ecore_main_loop_begin();
}

gboolean count_source(gpointer data)
{
    ++*static_cast<int *>(data);
    return G_SOURCE_CONTINUE;
}

Eina_Bool count_ecore(void *data)
{
    ++*static_cast<int *>(data);
    return ECORE_CALLBACK_RENEW;
}

TEST_F(Loop, EverybodyGetsATurn)
{
    int pipes[2];
    ASSERT_EQ(pipe(pipes), 0);
    ASSERT_EQ(write(pipes[1], "x", 1), 1); // never read: always ready
    int ready = 0, timeouts = 0, idle = 0, ecore_timers = 0;
    const guint ids[] = {
        g_unix_fd_add(
            pipes[0], G_IO_IN, [](int, GIOCondition, gpointer data) { return count_source(data); }, &ready),
        g_timeout_add(10, count_source, &timeouts), g_idle_add(count_source, &idle)};
    Ecore_Timer *timer = ecore_timer_add(0.01, count_ecore, &ecore_timers);
    run(0.5);
    EXPECT_GT(ready, 100);
    EXPECT_GE(timeouts, 20); // of 50: the machine may be busy
    EXPECT_GE(ecore_timers, 20);
    g_source_remove(ids[0]);
    const int idle_before = idle; // the ready descriptor came before it in GLib's order
    run(0.1);
    EXPECT_GT(idle, idle_before);
    g_source_remove(ids[1]);
    g_source_remove(ids[2]);
    ecore_timer_del(timer);
    close(pipes[0]);
    close(pipes[1]);
}

TEST_F(Loop, SleepsWhenThereIsNothingToDo)
{
    int glib = 0;
    const guint timeout = g_timeout_add(150, count_source, &glib);
    run(0.5);
    EXPECT_GE(glib, 2); // of 3: the machine may be busy
    EXPECT_LE(waits, 12);
    g_source_remove(timeout);
}

TEST_F(Loop, ShortTimersAreOnTimeWithoutSpinning)
{
    int count = 0;
    for (int tries = 0; tries < 10 && count <= 210; tries++) { // the machine may be busy
        count = waits = 0;
        Ecore_Timer *timer = ecore_timer_add(0.0004, count_ecore, &count);
        run(0.2);
        ecore_timer_del(timer);
    }
    EXPECT_GT(count, 210);             // rounded up to milliseconds it would be 200 at most
    EXPECT_LE(waits, 2 * count + 100); // rounded down it would be thousands
}

TEST_F(Loop, SourcesMayRunLoopsAndWakeFromOtherThreads)
{
    bool inner = false;
    g_idle_add(
        [](gpointer data) -> gboolean {
            g_timeout_add(
                5, [](gpointer flag) -> gboolean { return *static_cast<bool *>(flag) = true, G_SOURCE_REMOVE; }, data);
            while (!*static_cast<bool *>(data))
                ecore_main_loop_iterate();
            return G_SOURCE_REMOVE;
        },
        &inner);
    int from_thread = 0;
    std::thread thread([&] {
        for (int i = 0; i < 100; i++)
            g_idle_add([](gpointer data) -> gboolean { return count_source(data), G_SOURCE_REMOVE; }, &from_thread);
    });
    run(0.3);
    thread.join();
    EXPECT_TRUE(inner);
    EXPECT_EQ(from_thread, 100);
}
} // namespace
