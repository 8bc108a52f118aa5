#pragma once
// The pipes by which workers and the cloud client's threads report to the main loop.
#include <Ecore.h>
#include <cstddef>

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
