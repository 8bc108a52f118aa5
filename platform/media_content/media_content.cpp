#include "media_content/media_content.h"
#include "base/base.h"
#include "media_content/condition.h"
#include "media_content/thumbnail.h"
#include <atomic>
#include <condition_variable>
#include <cstring>
#include <deque>
#include <fstream>
#include <gio/gio.h>
#include <mutex>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>

struct media_filter_s {
    MediaCondition condition;
    std::string order;
};

struct media_info_s {
    std::string path;
    std::string thumbnail;
};

namespace {

// `looked` is 1 once a thumbnail was looked for: an unusable picture is not decoded at every query.
constexpr const char *SCHEMA = "CREATE TABLE IF NOT EXISTS media ("
                               " path TEXT PRIMARY KEY, type INTEGER NOT NULL, name TEXT NOT NULL,"
                               " timeline INTEGER NOT NULL, size INTEGER NOT NULL, thumbnail TEXT,"
                               " looked INTEGER NOT NULL DEFAULT 0)";

Db *index()
{
    return platform_thread_db("media.db", SCHEMA);
}

// The number of a media_content_type_e, or nothing for other files. The name is believed when it says something.
std::optional<media_content_type_e> media_type(const std::string &path)
{
    gboolean uncertain = FALSE;
    std::unique_ptr<char, decltype(&g_free)> type(g_content_type_guess(path.c_str(), nullptr, 0, &uncertain), g_free);
    if (uncertain) {
        char head[4096];
        std::ifstream file(path, std::ios::binary);
        file.read(head, sizeof head);
        type.reset(g_content_type_guess(path.c_str(), reinterpret_cast<guchar *>(head),
                                        static_cast<gsize>(file.gcount()), nullptr));
    }
    const std::unique_ptr<char, decltype(&g_free)> mime(type ? g_content_type_get_mime_type(type.get()) : nullptr,
                                                        g_free);
    if (mime && std::strncmp(mime.get(), "image/", 6) == 0)
        return MEDIA_CONTENT_TYPE_IMAGE;
    if (mime && std::strncmp(mime.get(), "video/", 6) == 0)
        return MEDIA_CONTENT_TYPE_VIDEO;
    return std::nullopt;
}

struct Job {
    std::string path;
    long long timeline;
    media_content_type_e type;
};

void forget(Db &db, const std::string &path)
{
    Stmt(db, "DELETE FROM media WHERE path = ?1").bind(1, path).done();
}

// Brings the record of a file up to date. `job` is set when its thumbnail has to be looked for. False when the file is
// none for the index, or the database fails (`db_failed`).
bool refresh(Db &db, const std::string &path, std::optional<Job> &job, bool &db_failed)
{
    struct stat file = {};
    if (path.empty() || path[0] != '/' || stat(path.c_str(), &file) != 0 || !S_ISREG(file.st_mode)) {
        forget(db, path);
        return false;
    }
    const long long timeline = file.st_mtime, size = file.st_size;
    Stmt known(db, "SELECT type, thumbnail, looked FROM media WHERE path = ?1 AND timeline = ?2 AND size = ?3");
    if (known.bind(1, path).bind(2, timeline).bind(3, size).row()) {
        const bool lost = !known.null(1) && access(known.text(1).c_str(), R_OK) != 0;
        if (lost || !known.integer(2))
            job = {path, timeline, static_cast<media_content_type_e>(known.integer(0))};
        return true;
    }
    const auto type = access(path.c_str(), R_OK) == 0 ? media_type(path) : std::nullopt;
    if (!type) {
        forget(db, path);
        return false;
    }
    Stmt enter(db, "INSERT OR REPLACE INTO media (path, type, name, timeline, size) VALUES (?1, ?2, ?3, ?4, ?5)");
    enter.bind(1, path).bind(2, static_cast<long long>(*type)).bind(3, path.substr(path.rfind('/') + 1));
    db_failed = !enter.bind(4, timeline).bind(5, size).done();
    job = {path, timeline, *type};
    return !db_failed;
}

void run(Db &db, const Job &job, const std::atomic<bool> &cancel)
{
    std::string thumbnail = thumbnail_find(job.path, job.timeline);
    if (thumbnail.empty() && job.type == MEDIA_CONTENT_TYPE_IMAGE)
        thumbnail = thumbnail_make(job.path, job.timeline, cancel);
    if (cancel)
        return;
    // A video's thumbnail may appear at any time, made by another program.
    const bool looked = job.type == MEDIA_CONTENT_TYPE_IMAGE || !thumbnail.empty();
    Stmt keep(db, "UPDATE media SET thumbnail = ?1, looked = ?2 WHERE path = ?3 AND timeline = ?4");
    keep.bind(1, thumbnail.empty() ? nullptr : thumbnail.c_str()).bind(2, looked ? 1LL : 0LL);
    keep.bind(3, job.path).bind(4, job.timeline).done();
}

// Makes thumbnails one after the other on a thread that ends with the last disconnect. Nobody waits for that end, since
// a decoder cannot be interrupted within a piece of its file; so the state is never freed.
class Maker {
  public:
    // Hands in a job and waits for it when no other is under way, for at most `patience`.
    void add(const Job &job, std::chrono::milliseconds patience)
    {
        std::unique_lock hold(lock);
        for (const Job &waiting : jobs)
            if (waiting.path == job.path && waiting.timeline == job.timeline)
                return;
        const bool alone = jobs.empty();
        jobs.push_back(job);
        if (!ended) {
            ended = std::make_shared<std::atomic<bool>>(false);
            std::thread(&Maker::work, this, ended).detach();
        }
        changed.notify_all();
        if (alone)
            changed.wait_for(hold, patience, [this] { return jobs.empty(); });
    }

    void stop()
    {
        const std::lock_guard hold(lock);
        if (ended)
            *ended = true;
        ended.reset();
        jobs.clear();
        changed.notify_all();
    }

  private:
    using Flag = std::shared_ptr<std::atomic<bool>>;
    std::mutex lock;
    std::condition_variable changed;
    std::deque<Job> jobs; // the first one is under way
    Flag ended;           // of the present thread: a later one must not revive one that ends

    void work(const Flag mine)
    {
        std::unique_lock hold(lock);
        for (;;) {
            changed.wait(hold, [&] { return *mine || !jobs.empty(); });
            if (*mine)
                return;
            const Job job = jobs.front();
            hold.unlock();
            if (Db *db = index())
                run(*db, job, *mine);
            hold.lock();
            if (*mine)
                return;
            jobs.pop_front();
            changed.notify_all();
        }
    }
};

Maker &maker()
{
    static Maker *the = new Maker;
    return *the;
}

std::mutex connection_lock;
std::atomic<int> connections{0};
constexpr std::chrono::milliseconds PATIENCE{40};

int copy_out(const std::string &text, char **out)
{
    char *copy = strdup(text.c_str());
    if (!copy)
        return MEDIA_CONTENT_ERROR_OUT_OF_MEMORY;
    *out = copy;
    return MEDIA_CONTENT_ERROR_NONE;
}

} // namespace

int media_content_connect()
{
    const std::lock_guard hold(connection_lock);
    if (!index())
        return MEDIA_CONTENT_ERROR_DB_FAILED;
    connections++;
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_content_disconnect()
{
    const std::lock_guard hold(connection_lock);
    if (connections == 0)
        return MEDIA_CONTENT_ERROR_INVALID_OPERATION;
    if (--connections == 0)
        maker().stop();
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_filter_create(filter_h *filter)
{
    if (!filter)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    *filter = new media_filter_s;
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_filter_destroy(filter_h filter)
{
    if (!filter)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    delete filter;
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_filter_set_condition(filter_h filter, const char *condition, media_content_collation_e collate)
{
    auto parsed = filter && condition ? media_parse_condition(condition, collate) : std::nullopt;
    if (!parsed)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    filter->condition = std::move(*parsed);
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_filter_set_order(filter_h filter, media_content_order_e order, const char *keywords,
                           media_content_collation_e collate)
{
    auto parsed = filter && keywords ? media_parse_order(keywords, order, collate) : std::nullopt;
    if (!parsed)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    filter->order = std::move(*parsed);
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_info_foreach_media_from_db_with_media_mode(filter_h filter, media_info_cb callback, void *user_data,
                                                     bool media_mode)
{
    if (!callback)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    if (connections == 0)
        return MEDIA_CONTENT_ERROR_INVALID_OPERATION;
    Db *db = index();
    if (!db)
        return MEDIA_CONTENT_ERROR_DB_FAILED;
    if (filter && !filter->condition.path.empty()) {
        std::optional<Job> job;
        bool failed = false;
        refresh(*db, filter->condition.path, job, failed);
        if (failed)
            return MEDIA_CONTENT_ERROR_DB_FAILED;
        if (job)
            maker().add(*job, PATIENCE);
    }

    std::string sql = "SELECT path, thumbnail FROM media";
    if (filter && !filter->condition.sql.empty())
        sql += " WHERE " + filter->condition.sql;
    if (filter && !filter->order.empty())
        sql += " ORDER BY " + filter->order;
    std::vector<media_info_s> found;
    {
        Stmt select(*db, sql.c_str());
        if (!select)
            return MEDIA_CONTENT_ERROR_DB_FAILED;
        int parameter = 0;
        if (filter)
            for (const auto &value : filter->condition.values) {
                parameter++;
                std::visit([&](const auto &v) { select.bind(parameter, v); }, value);
            }
        while (select.row())
            found.push_back({select.text(0), select.text(1)});
    }
    for (media_info_s &media : found) {
        if (media_mode && access(media.path.c_str(), F_OK) != 0) {
            forget(*db, media.path);
            continue;
        }
        if (!callback(&media, user_data))
            break;
    }
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_info_clone(media_info_h *dst, media_info_h src)
{
    if (!dst || !src)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    *dst = new media_info_s(*src);
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_info_destroy(media_info_h media)
{
    if (!media)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    delete media;
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_info_get_file_path(media_info_h media, char **path)
{
    return media && path ? copy_out(media->path, path) : MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
}

int media_info_get_thumbnail_path(media_info_h media, char **path)
{
    if (!media || !path)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    if (!media->thumbnail.empty())
        return copy_out(media->thumbnail, path);
    *path = nullptr;
    return MEDIA_CONTENT_ERROR_NONE;
}

int media_content_scan_file(const char *path)
{
    if (!path)
        return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    if (connections == 0)
        return MEDIA_CONTENT_ERROR_INVALID_OPERATION;
    Db *db = index();
    if (!db)
        return MEDIA_CONTENT_ERROR_DB_FAILED;
    std::optional<Job> job;
    bool db_failed = false;
    if (!refresh(*db, path, job, db_failed))
        return db_failed ? MEDIA_CONTENT_ERROR_DB_FAILED : MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
    static const std::atomic<bool> never{false};
    if (job)
        run(*db, *job, never);
    return MEDIA_CONTENT_ERROR_NONE;
}
