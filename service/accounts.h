#pragma once
// The accounts: who may sign in, by what, and how much each may store. Main thread only.
#include "base/base.h"
#include "tree.h"
#include <map>
#include <optional>
#include <set>

struct Account {
    long long id = 0;
    std::string email, display_name;
    int64_t quota = 0;      // bytes
    int64_t used = 0;       // bytes of the regular files in the folder
    int64_t reserved = 0;   // bytes that uploads under way may still add
    int64_t properties = 0; // bytes of the properties that clients stored
    Fd folder;              // the account's root folder

    // Counts bytes that came (or went). What people do to the tree by hand is only seen by the next start's recount.
    void count(int64_t bytes)
    {
        used = std::max<int64_t>(0, used + bytes);
    }
    int64_t stored() const
    {
        return used + properties;
    }
    // Bytes that may still be stored.
    int64_t left() const
    {
        return std::max<int64_t>(0, quota - used - reserved - properties);
    }
};

// A password that is not known to be right. run() may be called from any thread and takes some ten milliseconds.
struct PasswordCheck {
    std::string email, password;
    std::string hash; // of the account's password; empty when there is no such account, and then it takes as long
    bool is_right = false;

    void run();
};

// A device that is signed in.
struct Device {
    long long id = 0;
    std::string name;             // empty when it has not told it
    int64_t issued = 0, used = 0; // seconds since 1970; used: by some minutes, 0: never
};

class Accounts {
  public:
    // `db` and `files`, the folder that holds one folder per account, are borrowed for the object's life. False when
    // the tables cannot be made.
    bool open(Db &database, int files);
    // Adds the account, or sets only the quota of one that exists (quota < 0: leaves it). False and a reason for
    // people when the address or the password is no good or the database fails.
    bool add(const std::string &email, const std::string &password, int64_t quota, std::string &reason);
    enum class Made { YES, TAKEN, FAILED };
    // Makes an account that nobody had, with a hash from password_hash() and the usual quota. An address whose folder
    // still holds files of somebody else's is taken, too.
    Made make(const std::string &email, const std::string &hash);
    bool exists(const std::string &email);
    // A new token of 256 random bits for a device; only its SHA-256 is kept. Empty when there is no such account.
    std::string issue_token(const std::string &email, const std::string &device);
    // Ends a token; false when it is not known.
    bool revoke_token(const std::string &token);
    // The devices that are signed in to the account, the latest first.
    std::vector<Device> devices(const Account &account);
    // Ends the token of one of them; nothing happens when it is another account's.
    void sign_out(const Account &account, long long device);
    // Reads the value of an Authorization header (RFC 6750 Bearer, RFC 7617 Basic; null is allowed). Null when it
    // proves nothing; when `check` has a password then, it is to be run and settled. The account stays valid and at its
    // address for the object's life.
    Account *authorize(const char *header, PasswordCheck &check);
    // The same for an address and a password that somebody has typed.
    Account *authorize(const std::string &email, const std::string &password, PasswordCheck &check);
    // The account of a check that has run; null when the password was wrong.
    Account *settle(const PasswordCheck &check);
    // Null when there is no such account.
    Account *find(long long id);
    Account *find(const std::string &email);

  private:
    bool add_device_columns();
    Account *by_token(const std::string &token);
    std::string proof(const std::string &password, const std::string &hash) const;

    Db *db = nullptr;
    std::optional<Stmt> by_id, by_email; // kept, for every request needs them
    int root = -1;
    std::map<long long, Account> loaded;
    // Passwords that were right before, so that not every request of a Basic client pays for the slow hash: a keyed
    // hash, with a key of this process, of the password and the hash it was checked against.
    std::string key;
    std::set<std::string> proved;
};

// Whether the text can be an account's address: it names a folder and stands before ':' in credentials.
bool valid_email(const std::string &email);
// The text without what cannot be seen or turns the direction of writing, and not longer than so many characters.
std::string plain_text(const std::string &text, long characters);
