#pragma once
// What was found out about a service by trying it, and the files of our own that may lie on it under temporary names.
// Both are kept in the service's database, and in memory alone where that cannot be written. The client thread only.
#include "base/base.h"
#include "cloud_content_sync/service.h"
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace cloud {

// How a file is stored without replacing one that has its name.
enum class Way {
    CONDITION = 1, // PUT with "If-None-Match: *" is refused with 412
    MOVE = 2,      // that is ignored, but MOVE with "Overwrite: F" is refused with 412
    NONE = 3,      // both are ignored
};

// A new name that nobody else uses: ".velora-", 32 hexadecimal digits, ".part"; without the dot where a service refuses
// hidden names.
std::string temporary_name(bool is_hidden);
// Whether a file's name is one of those. Files of such names are no content and are never shown.
bool is_temporary_name(std::string_view name);

class Known {
  public:
    // Nothing is opened before something is asked for.
    explicit Known(const Service &service);

    // "way": a Way; "destination": 1 when a MOVE takes a path where others take an address; "digest": 0 when the
    // service's answers carry none; "auth": 1 when it asked for Digest. What was found out is believed for 30 days.
    std::optional<int> find(const std::string &key);
    void remember(const std::string &key, int value);
    // Forgets it, once, when the service does not do what was found out.
    void doubt(const std::string &key);

    // Notes the server path before something is stored there, and that nothing is there any more. `who` is the account.
    void add_temporary(const std::string &who, const std::string &path);
    void drop_temporary(const std::string &path);
    // Nothing was there when it was to be deleted. It is asked for again while a service may still be at work on what
    // was sent to it, which is a minute.
    void drop_temporary_if_old(const std::string &path);
    // Paths that nobody is at work on: of processes that have ended, and of uploads that were broken off. They are to
    // be deleted by whoever asks.
    std::vector<std::string> left_behind(const std::string &who);
    // Nobody is at work on it any more, and it may be there.
    void leave_temporary(const std::string &path);

    // Of a service without digests: whether the next file is to be read back, which the first one of a client is, and
    // one of sixteen.
    bool is_sample();

  private:
    Db *database();

    const std::string name, storage;
    Db db;
    bool was_opened = false;
    std::map<std::string, std::optional<int>> found;
    std::set<std::string> doubted;
    struct Temporary {
        std::string account;
        long long made = 0; // seconds since 1970
    };
    std::map<std::string, Temporary> left; // by path; also where the database fails
    std::string looked_for;                // the account whose rows in the database are in `left` as well
    unsigned samples = 0;
};

} // namespace cloud
