#include "velora_common/velora_handles.h"
#include <map>
#include <mutex>

static std::mutex s_handles_lock;
static std::map<uint32_t, void *> s_handles;
static uint32_t s_last_handle;

uint32_t _velora_common_handle_add(void *pointer)
{
    const std::lock_guard guard(s_handles_lock);
    s_handles[++s_last_handle] = pointer;
    return s_last_handle;
}

void *_velora_common_handle_find(uint32_t handle)
{
    const std::lock_guard guard(s_handles_lock);
    const auto found = s_handles.find(handle);
    return found == s_handles.end() ? nullptr : found->second;
}

void *_velora_common_handle_remove(uint32_t handle)
{
    const std::lock_guard guard(s_handles_lock);
    const auto found = s_handles.find(handle);
    if (found == s_handles.end())
        return nullptr;
    void *pointer = found->second;
    s_handles.erase(found);
    return pointer;
}
