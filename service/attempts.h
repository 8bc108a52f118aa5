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
    // Counts something else that somebody may do `most` times at once, and once more after so many seconds each. 0 when
    // it may be done, else the seconds after which it may be. `what` names it and who does it.
    int take(const std::string &what, double most, double seconds);

  private:
    // What is left of the attempts of one account or address, as of a moment.
    struct Bucket {
        double left = 0;
        int64_t moment = 0; // monotonic, microseconds
        int64_t full = 0;   // when it is full again, and says nothing more
    };
    Bucket &bucket(const std::string &key, double most, double per_second, int64_t now);
    void forget_full(int64_t now);

    std::map<std::string, Bucket> buckets;
};

// Where a client is, for what is counted per address: its address, or the network of 64 bits that IPv6 gives to a
// single customer.
std::string network_of(const std::string &peer);
