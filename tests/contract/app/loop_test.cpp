// GLib's sources on the Ecore main loop.
#include "app/glib_loop.h"
#include "driver.h"
#include <Ecore.h>
#include <Ecore_Evas.h>
#include <Evas.h>
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
    int sources[3] = {}, ecore[3] = {};
    const guint ids[] = {
        g_unix_fd_add(
            pipes[0], G_IO_IN, [](int, GIOCondition, gpointer data) { return count_source(data); }, &sources[0]),
        g_timeout_add(10, count_source, &sources[1]),
        g_idle_add(count_source, &sources[2]),
    };
    Ecore_Timer *timer = ecore_timer_add(0.01, count_ecore, &ecore[0]);
    Ecore_Animator *animator = ecore_animator_add(count_ecore, &ecore[1]);
    Ecore_Fd_Handler *handler = ecore_main_fd_handler_add(
        pipes[0], ECORE_FD_READ, [](void *data, Ecore_Fd_Handler *) { return count_ecore(data); }, &ecore[2], nullptr,
        nullptr);
    run(0.5);
    EXPECT_GT(sources[0], 100);
    EXPECT_GE(sources[1], 20); // of 50: the machine may be busy
    EXPECT_GE(ecore[0], 20);
    EXPECT_GE(ecore[1], 10); // of 30
    EXPECT_GT(ecore[2], 100);
    g_source_remove(ids[0]);
    const int idle_before = sources[2]; // the ready descriptor came before it in GLib's order
    ecore_main_fd_handler_del(handler);
    run(0.1);
    EXPECT_GT(sources[2], idle_before);
    g_source_remove(ids[1]);
    g_source_remove(ids[2]);
    ecore_timer_del(timer);
    ecore_animator_del(animator);
    close(pipes[0]);
    close(pipes[1]);
}

TEST_F(Loop, SleepsWhenThereIsNothingToDo)
{
    int glib = 0;
    const guint timeout = g_timeout_add(150, count_source, &glib);
    run(0.5);
    EXPECT_EQ(glib, 3);
    EXPECT_LE(waits, 12);
    g_source_remove(timeout);
}

TEST_F(Loop, ShortTimersAreOnTimeWithoutSpinning)
{
    int count = 0;
    const double start = ecore_time_get();
    ecore_timer_add(
        0.0004,
        [](void *data) -> Eina_Bool {
            if (++*static_cast<int *>(data) < 200)
                return ECORE_CALLBACK_RENEW;
            ecore_main_loop_quit();
            return ECORE_CALLBACK_CANCEL;
        },
        &count);
    ecore_main_loop_begin();
    EXPECT_LT(ecore_time_get() - start, 0.190); // rounded up to milliseconds it would be 0.2
    EXPECT_LE(waits, 500);                      // rounded down it would be thousands
}

TEST_F(Loop, SourcesMayRunLoopsAndWakeFromOtherThreads)
{
    static int depth = 0;
    int deepest = 0;
    g_idle_add(
        [](gpointer data) -> gboolean {
            depth++;
            bool inner = false;
            g_timeout_add(
                5, [](gpointer flag) -> gboolean { return *static_cast<bool *>(flag) = true, G_SOURCE_REMOVE; },
                &inner);
            while (!inner)
                ecore_main_loop_iterate();
            *static_cast<int *>(data) = depth--;
            return G_SOURCE_REMOVE;
        },
        &deepest);
    int from_thread = 0;
    std::thread thread([&] {
        for (int i = 0; i < 100; i++)
            g_idle_add([](gpointer data) -> gboolean { return count_source(data), G_SOURCE_REMOVE; }, &from_thread);
    });
    ecore_timer_add(
        0.005, [](void *) -> Eina_Bool { return ECORE_CALLBACK_CANCEL; }, nullptr);
    run(0.3);
    thread.join();
    EXPECT_EQ(deepest, 1);
    EXPECT_EQ(from_thread, 100);
}

TEST_F(Loop, WhatASourceChangesIsDrawnAndQueued)
{
    Ecore_Evas *ee = ecore_evas_buffer_new(20, 20);
    Evas_Object *rectangle = evas_object_rectangle_add(ecore_evas_get(ee));
    evas_object_resize(rectangle, 20, 20);
    evas_object_show(rectangle);
    ecore_evas_show(ee);
    struct State {
        Evas_Object *rectangle;
        int job = 0, drawn = 0;
    } state{rectangle};
    run(0.05);
    evas_event_callback_add(
        ecore_evas_get(ee), EVAS_CALLBACK_RENDER_POST,
        [](void *data, Evas *, void *) { static_cast<State *>(data)->drawn++; }, &state);
    g_timeout_add(
        5,
        [](gpointer data) -> gboolean {
            evas_object_color_set(static_cast<State *>(data)->rectangle, 255, 0, 0, 255);
            ecore_job_add([](void *of) { static_cast<State *>(of)->job++; }, data);
            return G_SOURCE_REMOVE;
        },
        &state);
    run(0.2);
    EXPECT_EQ(state.job, 1);
    EXPECT_GE(state.drawn, 1);
    EXPECT_EQ(static_cast<const unsigned *>(ecore_evas_buffer_pixels_get(ee))[0], 0xffff0000u);
    ecore_evas_free(ee);
}
} // namespace
