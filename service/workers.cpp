#include "workers.h"
#include <cstdint>
#include <glib-unix.h>
#include <sys/eventfd.h>
#include <unistd.h>

// GLib's own thread pool would do, but ThreadSanitizer cannot see how it hands over.
void Workers::start()
{
    wake_up = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    watch = g_unix_fd_add(
        wake_up, G_IO_IN,
        [](gint, GIOCondition, gpointer data) -> gboolean {
            static_cast<Workers *>(data)->finish_jobs();
            return G_SOURCE_CONTINUE;
        },
        this);
    for (size_t i = 0; i < count; i++)
        threads.emplace_back(&Workers::take_jobs, this);
}

Workers::~Workers()
{
    if (threads.empty())
        return;
    {
        const std::lock_guard guard(mutex);
        ending = true;
    }
    something_to_do.notify_all();
    for (std::thread &thread : threads)
        thread.join();
    g_source_remove(watch);
    close(wake_up);
}

void Workers::run(std::function<void()> work, std::function<void()> done)
{
    if (threads.empty())
        start();
    under_way++;
    {
        const std::lock_guard guard(mutex);
        waiting.push_back({std::move(work), std::move(done)});
    }
    something_to_do.notify_one();
}

void Workers::take_jobs()
{
    std::unique_lock lock(mutex);
    for (;;) {
        something_to_do.wait(lock, [this] { return ending || !waiting.empty(); });
        if (waiting.empty())
            return;
        Job job = std::move(waiting.front());
        waiting.pop_front();
        lock.unlock();
        job.work();
        lock.lock();
        finished.push_back(std::move(job));
        const uint64_t one = 1;
        if (write(wake_up, &one, sizeof one) < 0)
            continue; // the counter is full: the main loop is being woken already
    }
}

void Workers::finish_jobs()
{
    uint64_t times;
    if (read(wake_up, &times, sizeof times) < 0)
        return;
    std::deque<Job> jobs;
    {
        const std::lock_guard guard(mutex);
        jobs.swap(finished);
    }
    for (const Job &job : jobs) {
        under_way--;
        job.done();
    }
}
