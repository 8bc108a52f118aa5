#pragma once
// Reader of WebDAV's multi-status answers (RFC 4918, 13), fed piece by piece as they arrive.
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace cloud {

struct DavEntry {
    std::string path; // server path below the storage's root
    bool is_folder = false;
    long long size = -1; // bytes; -1: the service did not say
    long long mtime = 0; // seconds since 1970; 0: the service did not say
    std::string etag;
    long long quota_used = -1, quota_left = -1; // bytes; -1: the service did not say
    std::string sha256;                         // lower-case hexadecimal digits, or empty
};

// The body of a PROPFIND for what DavEntry holds; the digest only when it is asked for, for it may cost the service
// the reading of the file.
const char *propfind_body(bool with_digest);

// Document type declarations are refused, so no entity is ever declared or expanded; nothing is fetched. Answers over
// 64 MiB and texts over 64 KiB are refused. Entries without a usable href, and hrefs outside the root, are left out.
// To be used by one thread at a time.
class MultistatusReader {
  public:
    // root: the server path of the storage's root URL.
    explicit MultistatusReader(std::string root);
    ~MultistatusReader();
    MultistatusReader(const MultistatusReader &) = delete;
    MultistatusReader &operator=(const MultistatusReader &) = delete;

    // False as soon as the answer is refused.
    bool feed(const char *data, size_t size);
    // To be called once at the end: whether it was one whole multi-status document.
    bool finish();
    std::vector<DavEntry> entries;

    struct State; // of the XML parser's callbacks

  private:
    std::unique_ptr<State> state;
};

} // namespace cloud
