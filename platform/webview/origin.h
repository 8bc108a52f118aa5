#pragma once
#include <string>

// Scheme, host and port of an address of http or https.
struct Origin {
    std::string scheme, host;
    int port = 0;

    bool operator==(const Origin &) const = default;
    explicit operator bool() const
    {
        return !host.empty();
    }
    // For logs: an address may hold tokens, its origin does not.
    std::string text() const;
};

// Empty for other schemes, for what is no address, and for one that names a user.
Origin origin_of(const std::string &address);
