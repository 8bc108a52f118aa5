#pragma once
// Handles: 32-bit words that stand for pointers in messages between threads.
#include <cstdint>

// The table of handles: a handle is never 0 and never given out twice, so that one whose pointer was removed is not
// found rather than another's. The table owns nothing. Any thread.
uint32_t _velora_common_handle_add(void *pointer);
void *_velora_common_handle_find(uint32_t handle);   // null: not there (any more)
void *_velora_common_handle_remove(uint32_t handle); // what it stood for, or null
