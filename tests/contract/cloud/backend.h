#pragma once
// What the contract of the cloud client is tried against: WebDAV servers, or the fake library.
#include <memory>
#include <optional>
#include <string>
#include <vector>

struct Ability {
    bool real = true;               // a service on the network, with credentials and a description
    bool atomic_names = true;       // two clients at once never get the same name
    std::vector<std::string> taboo; // names that it refuses
};

// Options: what a test wants of the service, as long as it can.
struct Wish {
    int lose_reply = 0;  // store the nth upload but do not answer
    int fail_status = 0; // answer the first upload with this status
    int quota = 0;       // bytes
};

class Backend {
  public:
    virtual ~Backend() = default;
    virtual Ability ability() const = 0;
    virtual void make_folder(const std::string &path) = 0;
    virtual void store(const std::string &path, const std::string &bytes) = 0;
    virtual void remove(const std::string &path) = 0;
    virtual std::optional<std::string> content(const std::string &path) = 0;
    // Names below a folder, unsorted.
    virtual std::vector<std::string> list(const std::string &folder) = 0;
    // From now on the service cannot be reached.
    virtual void go_down() = 0;
};

// The backends of this program; each is started with an empty tree, its service is called "Test", and somebody is
// signed in to it. Null when the wish cannot be fulfilled.
std::vector<std::string> backend_names();
std::unique_ptr<Backend> start_backend(const std::string &name, const Wish &wish);

// A folder that is removed with everything in it.
struct Scratch {
    Scratch();
    ~Scratch();
    std::string path;
    // Writes a file into the folder and gives its path.
    std::string file(const std::string &name, const std::string &bytes) const;
};
// Bytes that are the same for the same seed.
std::string some_bytes(size_t size, unsigned seed);
