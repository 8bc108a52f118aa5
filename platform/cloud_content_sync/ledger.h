#pragma once
// The client's book of uploads: what a process that is gone has left to do, and of which uploads nobody can say whether
// they were stored. Rows of the account's database, so they survive whatever ends the process; every function may be
// called from any thread, and changes nothing when `who`, an identity, is not signed in.
#include "cloud_content_sync/account.h"
#include <mutex>
#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

namespace cloud {

struct LedgerRow {
    long long id = 0; // 0: not in the book yet
    std::string local_path, server_path;
    std::string target;        // where a body was sent of which nothing more is known, or empty
    bool is_inherited = false; // from an earlier process, which may have done more than it could write down
};

// Paths on the device and in the cloud, of one file after the other.
using LedgerPaths = std::vector<std::pair<std::string, std::string>>;

class Ledger {
  public:
    explicit Ledger(Account &owner) : account(owner) {}

    // Files that are going to be uploaded, in this order. All or none; false when they cannot be written.
    bool add(const std::string &who, const LedgerPaths &files);
    // Takes them out, but for those that were given up.
    bool remove(const std::string &who, const LedgerPaths &files);
    // What waits or was under way, in order; not what was given up.
    std::vector<LedgerRow> waiting(const std::string &who);

    // The row that an upload of these paths goes on with; there is one for each pair of paths, or a new one.
    LedgerRow begin(const std::string &who, const std::string &local_path, const std::string &server_path);
    // To be called before a body is sent to `target`.
    bool sent(const std::string &who, LedgerRow &row, const std::string &target);
    // The upload has failed for good, and whether it was stored is not known: the target is kept for another try.
    bool give_up(const std::string &who, const LedgerRow &row);
    // Nothing is left to be known of it.
    bool close(const std::string &who, const LedgerRow &row);

  private:
    Account &account;
    std::mutex mutex;
    std::unordered_set<long long> own; // rows that this process has made
};

// The statement of close(), for a transaction of the account's.
bool ledger_close(Db &db, const LedgerRow &row);

} // namespace cloud
