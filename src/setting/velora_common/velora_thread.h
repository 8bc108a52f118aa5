#pragma once
// Worker threads.
#include <pthread.h>

// Starts a joinable thread with default attributes. A failure is logged and leaves *thread as it was. Any thread.
void _velora_common_create_thread(pthread_t *thread, void *(*start_routine)(void *), void *arg);
