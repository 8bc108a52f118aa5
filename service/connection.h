#pragma once
// One connection of a Server.
#include "server.h"

struct Parser;

class Connection : public std::enable_shared_from_this<Connection> {
  public:
    // Owns `fd`. The certificate, null for plain HTTP, is borrowed.
    Connection(Server &owner, int fd, GTlsCertificate *certificate);
    ~Connection();
    Connection(const Connection &) = delete;
    Connection &operator=(const Connection &) = delete;

    void begin();
    // Closes it and lets go of its message; harmless when it has ended.
    void end();
    // Between two requests.
    bool is_idle() const
    {
        return state == State::IDLE;
    }
    // The request is whole and its answer not begun.
    bool is_handling() const
    {
        return state == State::HANDLING;
    }
    // When it is to be ended unless something comes or goes, by the monotonic clock; 0: never.
    gint64 deadline() const
    {
        return ends_at;
    }
    gint64 last_activity() const
    {
        return active_at;
    }
    // The message was paused or is not any more.
    void go_on();
    bool is_secure() const
    {
        return tls != nullptr;
    }
    std::string peer() const;

    std::list<std::shared_ptr<Connection>>::iterator place; // in the server's list

  private:
    enum class State { IDLE, HEADERS, BODY, HANDLING, WRITING, LINGERING, ENDED };
    struct Source;

    void move_to(State next);
    void still_active();
    void watch();
    void ready(GIOCondition condition);
    ssize_t receive(char *bytes, size_t size);
    ssize_t send(const char *bytes, size_t size);
    void read_some();
    void process();
    void begin_message();
    bool parse();
    void headers_are_there();
    bool is_sound() const;
    bool go_on_with_body();
    void answer_malformed(int status);
    void begin_answer();
    void write_some();
    bool refill();
    void answer_is_sent();

    Server &server;
    GSocketConnection *plain = nullptr;
    GIOStream *tls = nullptr; // null for plain HTTP
    int fd = -1;
    GSource *source = nullptr;     // of a plain socket; its condition changes
    gpointer source_tag = nullptr; // null: it waits for nothing
    GSource *tls_sources[2] = {};  // to read, to write
    State state = State::IDLE;
    gint64 active_at = 0, ends_at = 0;
    std::unique_ptr<Parser> parser;
    std::string input;  // received and not parsed yet
    std::string output; // of the answer, or of "100 Continue"; sent up to output_at
    size_t output_at = 0;
    int64_t sent = 0; // bytes of the answer's body
    bool is_processing = false, closes = false, is_first = true, owes_continue = false;
    std::shared_ptr<Message> message;
};
