#pragma once
// HTTP/1.1 connections (RFC 9112), plain or over TLS. Boost.Beast parses what arrives; sockets, TLS and the loop are
// GIO's. All of it runs on the main loop.
//
// libsoup's server was here before. Version 3.2 keeps every connection that its client has closed, and takes a chunked
// body that breaks off for a whole one.
#include "tree.h"
#include <functional>
#include <gio/gio.h>
#include <list>
#include <memory>
#include <string>
#include <vector>

class Connection;
class Server;

// A request and its answer. The functions that begin with got_ are called in this order, each at most once but
// got_body; once there is an answer only ended() follows. A message whose connection has ended is still valid while
// somebody holds it; its answer goes nowhere then.
class Message : public std::enable_shared_from_this<Message> {
  public:
    virtual ~Message() = default;

    // The headers are there. An answer now is sent before the body is read.
    virtual void got_headers() = 0;
    // More of the body; not called while the message is paused.
    virtual void got_body(const char *bytes, size_t size) = 0;
    // The end of the body was seen. Answers, or pauses and answers later.
    virtual void got_request() = 0;
    // The answer is sent, or the connection has ended without it.
    virtual void ended() = 0;

    const char *method() const
    {
        return verb.c_str();
    }
    bool verb_is(const char *wanted) const
    {
        return verb == wanted;
    }
    // As it was sent, without the query; begins with "/".
    const std::string &target_path() const
    {
        return target;
    }
    // What follows the "?"; null when there is none.
    const char *query() const
    {
        return query_at == std::string::npos ? nullptr : whole_target.c_str() + query_at;
    }
    bool has_fragment() const
    {
        return whole_target.find('#') != std::string::npos;
    }
    // The value of the first header of that name; null when there is none. Names are compared without case.
    const char *header(const char *name) const;
    // Bytes of the body by the Content-Length header, 0 when there is no body, -1 of a chunked one.
    int64_t body_length() const
    {
        return length;
    }
    bool is_secure() const;   // came over TLS
    std::string peer() const; // the client's address, without the port

    // The answer: its status, headers of its own, and a body of bytes or of a part of a file.
    void set_header(const char *name, const std::string &value);
    // Beside others of that name.
    void add_header(const char *name, const std::string &value);
    void answer(int code)
    {
        answer_status = code;
    }
    void answer(int code, const char *type, std::string content);
    // `bytes` of the file from `start` on. Of HEAD only the length is told.
    void answer_file(int code, Fd file, int64_t start, int64_t bytes);
    // Its connection is no longer there.
    bool has_ended() const
    {
        return connection == nullptr;
    }
    bool is_answered() const
    {
        return answer_status != 0;
    }

    // From pause() to unpause(), of which there must be as many, nothing more of the body is read and no answer sent.
    void pause();
    void unpause();
    // Ends the connection without an answer.
    void cut();

  private:
    friend class Connection;
    friend class Server;
    struct Field {
        std::string name, value;
    };

    Connection *connection = nullptr; // null when it has ended
    std::string verb, whole_target, target;
    size_t query_at = std::string::npos;
    std::vector<Field> request_fields, answer_fields;
    int64_t length = 0;
    int answer_status = 0, pauses = 0;
    std::string content;
    Fd file;
    int64_t file_at = 0, file_left = 0;
    bool is_file = false;
    gint64 begun = 0; // monotonic, in microseconds
};

// Why a connection is refused or ended by the clock, in seconds.
struct Patience {
    int headers = 30;   // from the first byte of a request to the end of its headers; from the start to that byte
    int idle = 60;      // between two requests
    int transfer = 120; // without a byte of a body, in either direction
    int lingering = 10; // after an answer that came before the body's end
};

class Server {
  public:
    // A message for the next request.
    using Make = std::function<std::shared_ptr<Message>()>;
    explicit Server(Make maker) : make(std::move(maker)) {}
    ~Server();
    Server(const Server &) = delete;
    Server &operator=(const Server &) = delete;

    // Listens at the address. `certificate` (null: plain HTTP) is borrowed. False and an error on failure.
    bool listen(GSocketAddress *address, GTlsCertificate *certificate, GError **error);
    // "http://127.0.0.1:8631/"
    std::string address() const;
    // Accepts no more connections and ends those that do nothing. The others end after their answer.
    void stop();
    // Ends connections on which nothing has come or gone for so many seconds.
    void end_stalled(int seconds);
    bool is_empty() const
    {
        return connections.empty();
    }

    Patience patience;
    // Called after each answer when it is set: one line without its end.
    std::function<void(const std::string &line)> log;

  private:
    friend class Connection;
    void accept();
    bool make_room();
    void pause_accepting();
    void sweep();

    const Make make;
    GSocket *socket = nullptr;
    GTlsCertificate *certificate = nullptr;
    guint accepting = 0, resume_timer = 0, sweeper = 0;
    size_t most = 0; // connections at a time; more would leave no descriptors for files
    bool is_stopping = false;
    std::list<std::shared_ptr<Connection>> connections;
};
