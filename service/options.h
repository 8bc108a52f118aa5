#pragma once
// The command line of velora-cloud.
#include "http.h"

struct Options {
    std::string root, listen = "127.0.0.1:8631", certificate, key;
    std::vector<std::string> accounts, tokens; // addresses
    int64_t quota = -1;                        // bytes; -1: not given
    Faults faults;
    Patience patience;
    Site site;
    int token_life = 0; // seconds; 0: not given
    bool is_serving = false, logs = false, logs_sql = false;
};

// 0, or the exit code of a wrong command line, of which standard error has been told.
int read_options(int argc, char **argv, Options &options);
// Prints "velora-cloud: TEXT" to standard error; the code.
int complain(int code, const std::string &text);
// HOST:PORT, where the host is a numeric address or "localhost". Null when it is neither; the caller's.
GSocketAddress *read_socket_address(const std::string &text);
// The next line of standard input, asked for without an echo where it is a terminal. False at its end.
bool read_password(const std::string &email, std::string &password);
