// The client on a device whose disk is full or read-only: it uploads all the same, and says that it can keep nothing.
#include "scripted_server.h"
#include <cerrno>
#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>

namespace {

enum class Disk { FINE, FULL, READ_ONLY };
std::atomic<Disk> s_disk = Disk::FINE;

// What SQLite calls in place of the system's. A full disk still takes what lies within a file.
ssize_t write_at(int fd, const void *bytes, size_t size, off_t at)
{
    struct stat file = {};
    if (s_disk != Disk::FINE && (fstat(fd, &file) != 0 || at + static_cast<off_t>(size) > file.st_size)) {
        errno = ENOSPC;
        return -1;
    }
    return pwrite(fd, bytes, size, at);
}

int open_file(const char *path, int flags, int mode)
{
    if (s_disk == Disk::READ_ONLY && (flags & (O_RDWR | O_WRONLY | O_CREAT))) {
        errno = EROFS;
        return -1;
    }
    return open(path, flags, mode);
}

class OnDisk : public Scripted {
  protected:
    static void SetUpTestSuite()
    {
        sqlite3_vfs *vfs = sqlite3_vfs_find(nullptr);
        for (const char *name : {"pwrite", "pwrite64"})
            vfs->xSetSystemCall(vfs, name, reinterpret_cast<sqlite3_syscall_ptr>(write_at));
        vfs->xSetSystemCall(vfs, "open", reinterpret_cast<sqlite3_syscall_ptr>(open_file));
    }
    void TearDown() override
    {
        Scripted::TearDown();
        s_disk = Disk::FINE;
    }
    // As another process does, on that disk.
    void come_back(Disk disk)
    {
        cloud_content_sync_destroy(std::exchange(handle, nullptr));
        s_disk = disk;
        ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    }
    bool is_persistent()
    {
        bool persistent = false;
        EXPECT_EQ(cloud_content_sync_get_is_persistent(handle, &persistent), 0);
        return persistent;
    }
    // Says `next` to the requests that come, and hears which they are.
    void answer_with(Names next)
    {
        const std::string self = folder("/r%20t/");
        serve([this, self, next, at = size_t(0)](const Request &request) mutable {
            if (request.path == "/r%20t/")
                return multistatus(self + file("/r%20t/known.txt"));
            methods += request.method == "PUT" ? "U" : request.method == "PROPFIND" ? "L" : "?";
            return at < next.size() ? next[at++] : answer("500 Too many requests");
        });
    }
    std::string queued()
    {
        std::string all;
        const auto append = [](const char *, const char *path, void *to) {
            *static_cast<std::string *>(to) += path;
            return true;
        };
        EXPECT_EQ(cloud_content_sync_queue_foreach(handle, append, &all), 0);
        return all;
    }
    int enter(const char *target)
    {
        const char *from = local.c_str();
        return cloud_content_sync_queue_add(handle, &from, &target, 1);
    }

    const std::string local = scratch.file("hello", "hello");
    const std::string stored = answer("201 Created", "", HELLO_DIGEST), lost, none = answer("404 Not Found"),
                      found = multistatus(file("/r%20t/x", "5", "<v:sha256>" + std::string(HELLO_HEX) + "</v:sha256>"));
    std::string methods; // the server's, under its lock
};

} // namespace

TEST_F(OnDisk, what_is_there_is_read_and_uploads_go_on)
{
    constexpr int OPEN = CLOUD_CONTENT_SYNC_ERROR_OUTCOME_UNKNOWN;
    for (const Disk disk : {Disk::FULL, Disk::READ_ONLY}) {
        SCOPED_TRACE(static_cast<int>(disk));
        methods.clear();
        answer_with({lost, lost, lost, found, stored, lost, lost, lost, found});
        ASSERT_EQ(refresh(handle), 0);
        ASSERT_EQ(enter("/left"), 0);
        ASSERT_EQ(upload(handle, local, "/x"), OPEN);
        come_back(disk);
        EXPECT_FALSE(is_persistent());
        EXPECT_EQ(listing(handle, "/"), Names{"known.txt:5"});
        EXPECT_EQ(queued(), "/left");
        EXPECT_EQ(upload(handle, local, "/x"), 0); // an earlier process has stored it
        EXPECT_EQ(upload(handle, local, "/y"), 0);
        EXPECT_EQ(listing(handle, "/"), (Names{"known.txt:5", "x:5", "y:5"}));
        // What is not on the disk is known as long as the process is there.
        EXPECT_EQ(upload(handle, local, "/z"), OPEN);
        EXPECT_EQ(upload(handle, local, "/z"), 0);
        EXPECT_EQ(refresh(handle), 0);
        EXPECT_EQ(methods, "ULLLUULLL");
        // Nothing says that it is kept which is not.
        EXPECT_EQ(enter("/new"), CLOUD_CONTENT_SYNC_ERROR_DB_FAILED);
        EXPECT_EQ(cloud_content_sync_setting_set_camera_upload(handle, true), CLOUD_CONTENT_SYNC_ERROR_DB_FAILED);
        EXPECT_EQ(cloud_content_sync_credentials_set("Test", nullptr, nullptr, "other"),
                  CLOUD_CONTENT_SYNC_ERROR_DB_FAILED);
        come_back(Disk::FINE);
        EXPECT_TRUE(is_persistent());
        EXPECT_EQ(listing(handle, "/"), Names{"known.txt:5"});
        std::filesystem::remove_all(home.path + "/cloud");
    }
}

// The disk has no room any more in the middle of a run. What could not be written down is not uploaded twice.
TEST_F(OnDisk, a_disk_that_fills_up_stops_nothing)
{
    Names answers = {stored};
    for (int i = 0; i < 400; i++)
        answers.push_back(stored);
    answers.insert(answers.end(), {answer("412 Taken"), found});
    answer_with(answers);
    ASSERT_EQ(enter("/x"), 0);
    ASSERT_EQ(upload(handle, local, "/before"), 0);
    s_disk = Disk::FULL;
    for (int i = 0; i < 400; i++)
        ASSERT_EQ(upload(handle, local, i == 399 ? "/x" : "/" + std::string(100, 'n') + std::to_string(i)), 0);
    EXPECT_FALSE(is_persistent());
    EXPECT_EQ(listing(handle, "/").size(), 401u);
    come_back(Disk::FINE);
    EXPECT_TRUE(queued().starts_with("/x")); // and the one that was being sent
    std::string landed;
    EXPECT_EQ(upload(handle, local, "/x", &landed), 0);
    EXPECT_EQ(landed, "/x");
    EXPECT_FALSE(queued().starts_with("/x"));
    EXPECT_EQ(methods.substr(401), "UL");
}
