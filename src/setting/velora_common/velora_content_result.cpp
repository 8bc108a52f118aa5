#include "velora_common/velora_content_result.h"
#include <cstring>

bool _velora_common_is_content_result(const void *buffer, size_t size, ContentResultMessage *message)
{
    if (size != sizeof(ContentResultMessage))
        return false;
    std::memcpy(message, buffer, sizeof *message);
    return message->kind == CONTENT_RESULT_DOWNLOAD || message->kind == CONTENT_RESULT_STREAMING_URL ||
           message->kind == CONTENT_RESULT_CACHED_FILE;
}
