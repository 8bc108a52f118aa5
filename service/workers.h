#pragma once
// Threads for the work that would hold up the main loop.
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

class Workers {
  public:
    explicit Workers(size_t thread_count) : count(thread_count) {}
    // Every job that was started must be done: see busy().
    ~Workers();
    Workers(const Workers &) = delete;
    Workers &operator=(const Workers &) = delete;

    // Runs `work` on a thread of the pool, then `done` on the main loop. From the main loop only. `work` must touch
    // nothing that the main loop uses meanwhile, and no GLib object of anybody else's.
    void run(std::function<void()> work, std::function<void()> done);
    // Whether a `done` is still to come. From the main loop only.
    bool busy() const
    {
        return under_way > 0;
    }

  private:
    struct Job {
        std::function<void()> work, done;
    };
    void start();
    void take_jobs();
    void finish_jobs();

    std::mutex mutex; // guards waiting, finished and ending
    std::condition_variable something_to_do;
    std::deque<Job> waiting, finished;
    bool ending = false;
    const size_t count;
    std::vector<std::thread> threads;
    int wake_up = -1; // an eventfd by which the main loop learns of finished jobs
    unsigned watch = 0;
    int under_way = 0;
};
