#pragma once
// What the cloud client's result callbacks send over the upload view's pipe.
#include <cstddef>
#include <cstdint>

// The record that result callbacks of the cloud client send: eight 32-bit little-endian words. Our pointers have 64
// bits, so strings and rows travel as handles of velora_handles.h.
struct ContentResultMessage {
    int32_t error = 0;
    int32_t kind = 0;
    int32_t third = 0;           // third argument of a download or cached-file result
    int32_t streaming_third = 0; // third argument of a streaming-address result
    uint32_t path = 0;           // handle of an owned string
    uint32_t url = 0;            // handle of an owned string
    int32_t state = 0;
    uint32_t row = 0; // handle of an ItemData
};
static_assert(sizeof(ContentResultMessage) == 32);

enum ContentResultKind {
    CONTENT_RESULT_DOWNLOAD = 4,
    CONTENT_RESULT_STREAMING_URL = 6,
    CONTENT_RESULT_CACHED_FILE = 10,
};

// True when a payload is such a record and not a text; *message is then filled. Any thread.
bool _velora_common_is_content_result(const void *buffer, size_t size, ContentResultMessage *message);
