#include "velora_upload_file/upload_message.h"
#include <cstdlib>
#include <cstring>

bool __is_of_item(const std::string &verb)
{
    return verb == "store" || verb == "update";
}

// Takes the piece before the next full stop off; false when nothing is left.
static bool __next_piece(std::string *rest, bool *is_over, std::string *piece)
{
    if (*is_over)
        return false;
    const size_t stop = rest->find('.');
    *is_over = stop == rest->npos;
    *piece = rest->substr(0, stop);
    rest->erase(0, *is_over ? rest->size() : stop + 1);
    return true;
}

Message __message_read(const void *buffer, unsigned int size)
{
    const auto *text = static_cast<const char *>(buffer);
    std::string rest(text, strnlen(text, size)), piece;
    bool is_over = false;
    Message message;
    __next_piece(&rest, &is_over, &message.verb);
    if (!__next_piece(&rest, &is_over, &piece))
        return message;
    if (!__is_of_item(message.verb) && message.verb != "thumb") {
        message.run = static_cast<int>(std::strtol(piece.c_str(), nullptr, 10));
        return message;
    }
    message.has_number = !piece.empty();
    message.number = std::strtol(piece.c_str(), nullptr, 10);
    if (__next_piece(&rest, &is_over, &piece))
        message.run = static_cast<int>(std::strtol(piece.c_str(), nullptr, 10));
    return message;
}
