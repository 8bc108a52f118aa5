#pragma once
// How often passwords may be tried. Main thread only.
#include <cstddef>
#include <cstdint>
#include <map>
#include <string>

class Attempts {
  public:
    // Counts an attempt at an account, whether there is one or not, from an address. 0 when it may be made, else the
    // seconds after which the next may be.
    int begin(const std::string &account, const std::string &address);
    // It was the right password: it does not count.
    void succeeded(const std::string &account, const std::string &address);

  private:
    // What is left of the attempts of one account or address, as of a moment.
    struct Bucket {
        double left = 0;
        int64_t moment = 0; // monotonic, microseconds
    };
    Bucket &bucket(const std::string &key, double most, double per_second, int64_t now);
    void forget_full(int64_t now);

    std::map<std::string, Bucket> buckets;
};
