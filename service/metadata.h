#pragma once
// What is known about files beside the files themselves: digests and dead properties. Main thread only.
#include "accounts.h"
#include <unordered_map>

// A property that a client stored: `xml` is the whole element, with the namespace declarations that it needs.
struct DeadProperty {
    std::string ns, name, xml;
};
using DeadProperties = std::vector<DeadProperty>;
struct Digest {
    int64_t size = 0, modified = 0;
    uint64_t inode = 0;
    std::string sha256; // 64 hexadecimal digits

    // Whether it is the digest of what the entry is now.
    bool valid_for(const Entry &entry) const
    {
        return entry.kind == Entry::FILE && size == entry.size && modified == entry.modified && inode == entry.inode;
    }
};

class Metadata {
  public:
    // False when the tables cannot be made. `db` is borrowed for the object's life.
    bool open(Db &database);

    // The digest of a file's content, 64 hexadecimal digits; empty when it is not known or the file has changed since.
    std::string digest(const Account &account, const Path &path, const Entry &entry);
    // The stored digests of a folder's files by name, current or not.
    std::unordered_map<std::string, Digest> digests_in(const Account &account, const Path &folder);
    void set_digest(const Account &account, const std::string &folder, const Entry &entry, const std::string &sha256);

    DeadProperties properties(const Account &account, const Path &path);
    // The dead properties of what is in a folder, by name.
    std::unordered_map<std::string, DeadProperties> properties_in(const Account &account, const Path &folder);
    // Sets the properties that have an `xml` and removes those without, all or none: none when the account's quota does
    // not allow it. This and the changes below keep account.properties.
    bool change_properties(Account &account, const Path &path, const DeadProperties &changes);
    // Bytes of the account's properties; of those of a path, and of what is below it if `deep`.
    int64_t properties_size(const Account &account);
    int64_t properties_size(const Account &account, const Path &path, bool deep);

    // Of a path below which there is nothing.
    void forget_file(Account &account, const Path &path);
    // All of these act on a path and what is below it; the path is never the root.
    void forget(Account &account, const Path &path);
    void moved(Account &account, const Path &from, const Path &to);
    void copied(Account &account, const Path &from, const Path &to, bool deep, const std::vector<CopiedFile> &files);

  private:
    Db *db = nullptr;
};
