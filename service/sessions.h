#pragma once
// Who is signed in with a browser, and that forms are sent by whom they were shown to. Main thread only.
#include <cstdint>
#include <map>
#include <string>

class Sessions {
  public:
    Sessions();

    // What a browser is known by: 256 random bits, in a cookie. Nothing is kept of it until somebody signs in.
    static std::string new_id();
    static bool is_id(const std::string &text);
    // Signs an account in and gives the new id by which the browser is known from then on: whoever knew the old one
    // gains nothing. `language` is that of the pages which are asked for without one.
    std::string begin(long long account, const std::string &language);
    // The account that is signed in, 0 when none is (or no more). `language` is set with it.
    long long account_of(const std::string &id, std::string &language);
    void end(const std::string &id);
    // What a form that was shown to this browser brings back.
    std::string form_token(const std::string &id) const;

  private:
    struct Session {
        long long account = 0;
        std::string language;
        int64_t ends = 0; // monotonic, microseconds
    };
    void make_room(long long account);

    std::string key;                          // of this process
    std::map<std::string, Session> signed_in; // by a digest of the id
};
