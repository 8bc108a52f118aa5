#pragma once
// What the public functions share.
#include "cloud_content_sync/client.h"
#include <cstdlib>
#include <cstring>

struct cloud_content_sync_s {
    std::shared_ptr<cloud::Client> client;
};

namespace cloud {

// Gives a text to the caller; 0.
inline int give(const std::string &text, char **out)
{
    // Names come from file systems: they hold no NUL.
    *out = strdup(text.c_str());
    if (!*out)
        std::abort();
    return CLOUD_CONTENT_SYNC_ERROR_NONE;
}

} // namespace cloud
