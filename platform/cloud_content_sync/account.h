#pragma once
// The metadata database of one service: the account's folder tree as the last refresh and later uploads left it.
#include "base/base.h"
#include "cloud_content_sync/credentials.h"
#include <atomic>
#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace cloud {

struct FolderRow {
    std::string path;
    std::string name;
};

struct ContentRow {
    std::string parent; // path of the folder
    std::string name;
    long long size = 0; // bytes
    long long mtime = 0;
    std::string etag;
};

// Two connections: readers are not held up while a refresh is written. Every function may be called from any thread.
class Account {
  public:
    explicit Account(Service service);
    // Opens, and creates when it is missing, platform_data_dir()/cloud/SERVICE.db. Where the disk is full or read-only
    // it is a copy in memory, which the other functions go over to as well when a change cannot be written.
    bool open();
    // Whether what is written outlives the process.
    bool is_persistent() const
    {
        return !is_copy;
    }

    const Service service;

    // account_identity() of who is signed in; empty when nobody is.
    std::string identity() const;
    // Stores the credentials; null: nobody is signed in any more. What is kept of another account goes, but for its
    // settings; with null those of the account that was signed in go as well. False when they cannot be stored, or what
    // is kept cannot be removed for null: whoever was signed in is so still. *former, which may be null, is who that
    // was; its secret is empty when it is not to be had.
    bool sign_in(const Credentials *credentials, std::optional<Credentials> *former = nullptr);
    // Does `work` while nobody can sign in or out, in a transaction of the database that its result ends. False, and
    // nothing done, when `who`, an identity, is not signed in.
    bool while_signed_in(const std::string &who, const std::function<bool()> &work);
    // For what other files of the client keep in the database: while_signed_in() with the connection that writes, and
    // `work` with the one that reads, which others wait for.
    bool write(const std::string &who, const std::function<bool(Db &)> &work);
    // The same, and it is on the disk on return, so that it survives a flat battery; false also where it cannot be.
    bool write_now(const std::string &who, const std::function<bool(Db &)> &work);
    void read(const std::function<void(const Db &)> &work);

    bool folder_exists(const std::string &path);
    // In the order of sort_key().
    std::vector<FolderRow> folders_of(const std::string &parent);
    std::vector<ContentRow> contents_of(const std::string &parent);

    // Puts what a refresh found in the place of everything that is there, in one transaction. `later` are files stored
    // since the refresh began; those whose folder is gone are left out. The root is not a row of `folders`. This and
    // the other changes are for the account `who` and answer false when it is not signed in (any more).
    bool replace(const std::vector<FolderRow> &folders, const std::vector<ContentRow> &contents,
                 const std::vector<ContentRow> &later, const std::string &who);
    // `more`, which may be empty, is done in the same transaction.
    bool insert(const ContentRow &content, const std::string &who, const std::function<bool(Db &)> &more = nullptr);
    std::optional<ContentRow> content_at(const std::string &parent, const std::string &name);
    // Changes the row of that parent and name; nothing when there is none.
    bool update(const ContentRow &content, const std::string &who);

    // The account (account_identity()) whose whole tree the database holds; empty when there is none.
    std::string complete_for();

    // A setting of the account that is signed in; `fallback` when it has none of that key, or nobody is signed in.
    long long setting(const std::string &key, long long fallback);
    // One of cloud_content_sync_error_e: NO_ACCOUNT when nobody is signed in, DB_FAILED.
    int set_setting(const std::string &key, long long value);

  private:
    bool attempt(const std::function<bool()> &work, bool *is_disk_trouble);
    bool change(const std::function<bool()> &work, bool may_leave_disk = false);
    bool open_copy();
    bool replace_credentials(const Credentials *next, std::optional<Credentials> &former);
    bool clear();
    bool forget_settings();

    std::mutex reading, writing;
    Db reader, writer;
    std::atomic<bool> is_copy = false; // changed under both locks
};

} // namespace cloud
