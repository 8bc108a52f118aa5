// What a request's handlers ask of it, and answer.
#include "connection.h"

const char *Message::header(const char *name) const
{
    for (const Field &field : request_fields)
        if (g_ascii_strcasecmp(field.name.c_str(), name) == 0)
            return field.value.c_str();
    return nullptr;
}

bool Message::is_secure() const
{
    return connection && connection->is_secure();
}

std::string Message::peer() const
{
    return connection ? connection->peer() : "";
}

void Message::set_header(const char *name, const std::string &value)
{
    std::erase_if(answer_fields,
                  [name](const Field &field) { return g_ascii_strcasecmp(field.name.c_str(), name) == 0; });
    add_header(name, value);
}

void Message::add_header(const char *name, const std::string &value)
{
    answer_fields.push_back({name, value});
}

void Message::answer(int code, const char *type, std::string bytes)
{
    answer(code);
    set_header("Content-Type", type);
    content = std::move(bytes);
}

void Message::answer_file(int code, Fd part, int64_t start, int64_t bytes)
{
    answer(code);
    file = std::move(part);
    file_at = start;
    file_left = bytes;
    is_file = true;
}

void Message::pause()
{
    pauses++;
}

void Message::unpause()
{
    if (--pauses == 0 && connection)
        connection->go_on();
}

void Message::cut()
{
    if (connection)
        connection->end();
}
