// Messages of the upload view's pipe: of any bytes no more is read than there are, and a verb is a whole piece.
#include "fuzz.h"
#include "velora_common/velora_content_result.h"
#include "velora_upload_file/upload_message.h"
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size == 0)
        return 0;
    const std::vector<uint8_t> exact(data, data + size); // the sanitizer sees its end
    ContentResultMessage result;
    const bool is_result = _velora_common_is_content_result(exact.data(), exact.size(), &result);
    must(!is_result || size == sizeof result);
    const Message message = __message_read(exact.data(), static_cast<unsigned>(exact.size()));
    must(message.verb.find('.') == message.verb.npos && message.verb.size() <= size);
    must(!message.has_number || __is_of_item(message.verb) || message.verb == "thumb");
    return 0;
}
