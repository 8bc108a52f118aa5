#pragma once
// Worker threads, and the pipes by which they report to the main loop.
#include <Ecore.h>
#include <cstddef>
#include <cstdint>
#include <pthread.h>

// Starts a joinable thread with default attributes. A failure is logged and leaves *thread as it was. Any thread.
void _velora_common_create_thread(pthread_t *thread, void *(*start_routine)(void *), void *arg);

// A pipe whose handler runs on the main loop, once per message, in the order in which the messages were sent. All
// sends go through _velora_common_pipe_send; it goes away with _velora_common_pipe_del. Main loop only, but for a
// creation while the main loop is held by ecore_thread_main_loop_begin.
Ecore_Pipe *_velora_common_pipe_add(Ecore_Pipe_Cb handler, void *data);

// Deletes a pipe; unread messages are dropped. Nobody may send on it any more. Main loop only.
void _velora_common_pipe_del(Ecore_Pipe *pipe);

// Sends `size` bytes (at most 1024) as one message. It never waits for the reader, and tears no message of another
// thread: what the kernel's pipe cannot take at once is kept here until the handler has read some. Any thread, the
// main loop among them. False when the pipe is not one of ours or refuses the write.
bool _velora_common_pipe_send(Ecore_Pipe *pipe, const void *buffer, size_t size);

// Sends a text with its final NUL. A text "update.N" that is still unread is not sent a second time: it says no more
// than "look again". The caller keeps `msg`. Any thread.
void _velora_common_pipe_send_msg(Ecore_Pipe *pipe, const char *msg);

// The record that result callbacks of the cloud client send: eight 32-bit little-endian words. Our pointers have 64
// bits, so strings and rows travel as handles of the table below.
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

// The table of handles: a handle is never 0 and never given out twice, so that one whose pointer was removed is not
// found rather than another's. The table owns nothing. Any thread.
uint32_t _velora_common_handle_add(void *pointer);
void *_velora_common_handle_find(uint32_t handle);   // null: not there (any more)
void *_velora_common_handle_remove(uint32_t handle); // what it stood for, or null
