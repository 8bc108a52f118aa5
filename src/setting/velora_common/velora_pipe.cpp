#include "velora_common/velora_pipe.h"
#include "velora_common/velora_log.h"
#include <algorithm>
#include <cstring>
#include <deque>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>

namespace {

// A pipe may be as small as one page when its user has many; ecore adds a word with the length to each message.
constexpr size_t in_flight_most = 3072;
constexpr size_t message_most = 1024;

size_t cost(size_t size)
{
    return size + sizeof(size_t);
}

struct Channel {
    Ecore_Pipe *pipe = nullptr;
    Ecore_Pipe_Cb handler = nullptr;
    void *data = nullptr;
    int handling = 0; // calls of the handler under way; main loop

    std::mutex lock;                 // guards all below, and the pipe's write end; never held across a handler
    std::deque<std::string> waiting; // not in the kernel's pipe yet
    bool is_deleted = false;
    size_t in_flight = 0;               // bytes in the kernel's pipe
    std::set<std::string> unread_hints; // "update.N" texts on their way

    // Puts what fits into the kernel's pipe. ecore_pipe_write makes two writes, so it is called under the lock alone.
    bool flush()
    {
        bool written = true;
        while (!waiting.empty() && in_flight + cost(waiting.front().size()) <= in_flight_most) {
            const std::string &message = waiting.front();
            if (ecore_pipe_write(pipe, message.data(), static_cast<unsigned>(message.size()))) {
                in_flight += cost(message.size());
            } else {
                written = false;
                unread_hints.erase(message); // nobody will read it: the next one must be sent
            }
            waiting.pop_front();
        }
        return written;
    }
};

std::mutex channels_lock;
std::map<uintptr_t, std::shared_ptr<Channel>> channels; // by a number that is never used again
uintptr_t last_channel;

std::shared_ptr<Channel> channel_of(Ecore_Pipe *pipe, bool take_out = false)
{
    const std::lock_guard guard(channels_lock);
    for (auto entry = channels.begin(); entry != channels.end(); ++entry) {
        if (entry->second->pipe != pipe)
            continue;
        std::shared_ptr<Channel> channel = entry->second;
        if (take_out)
            channels.erase(entry);
        return channel;
    }
    return nullptr;
}

std::shared_ptr<Channel> channel_of(uintptr_t number)
{
    const std::lock_guard guard(channels_lock);
    const auto found = channels.find(number);
    return found == channels.end() ? nullptr : found->second;
}

bool is_hint(const std::string &message)
{
    return message.starts_with("update.");
}

} // namespace

static void __pipe_read_cb(void *data, void *buffer, unsigned int size)
{
    // The handler may delete the pipe: this reference keeps the record until it has returned.
    const std::shared_ptr<Channel> channel = channel_of(reinterpret_cast<uintptr_t>(data));
    if (!channel)
        return;
    bool written = true;
    {
        const std::lock_guard guard(channel->lock);
        channel->in_flight -= std::min(channel->in_flight, cost(size));
        // Read from here on: a change after this moment sends a message of its own.
        if (const std::string message(static_cast<const char *>(buffer), buffer ? size : 0); is_hint(message))
            channel->unread_hints.erase(message);
        written = channel->flush();
    }
    if (!written)
        VELORA_LOGE("ecore_pipe_write failed");
    channel->handling++;
    channel->handler(channel->data, buffer, size);
    channel->handling--;
}

Ecore_Pipe *_velora_common_pipe_add(Ecore_Pipe_Cb handler, void *data)
{
    auto channel = std::make_shared<Channel>();
    channel->handler = handler;
    channel->data = data;
    const std::lock_guard guard(channels_lock);
    channel->pipe = ecore_pipe_add(__pipe_read_cb, reinterpret_cast<void *>(++last_channel));
    if (!channel->pipe) {
        VELORA_LOGE("ecore_pipe_add failed");
        return nullptr;
    }
    channels[last_channel] = channel;
    return channel->pipe;
}

void _velora_common_pipe_del(Ecore_Pipe *pipe)
{
    const std::shared_ptr<Channel> channel = pipe ? channel_of(pipe, true) : nullptr;
    if (!channel)
        return;
    const std::lock_guard guard(channel->lock);
    channel->is_deleted = true;
    // Of a message of which it has read the length alone ecore would forget to free the rest. Nobody hears of it any
    // more.
    if (channel->handling == 0)
        ecore_pipe_wait(pipe, 1, 0.0);
    ecore_pipe_del(pipe);
}

bool _velora_common_pipe_send(Ecore_Pipe *pipe, const void *buffer, size_t size)
{
    const std::shared_ptr<Channel> channel = channel_of(pipe);
    if (!channel || size > message_most)
        return false;
    const std::lock_guard guard(channel->lock);
    if (channel->is_deleted)
        return false;
    std::string message(static_cast<const char *>(buffer), size);
    if (is_hint(message) && !channel->unread_hints.insert(message).second)
        return true;
    channel->waiting.push_back(std::move(message));
    return channel->flush();
}

void _velora_common_pipe_send_msg(Ecore_Pipe *pipe, const char *msg)
{
    if (!pipe) {
        VELORA_LOGE("pipe is NULL");
        return;
    }
    if (!_velora_common_pipe_send(pipe, msg, std::strlen(msg) + 1))
        VELORA_LOGE("ecore_pipe_write failed");
}
