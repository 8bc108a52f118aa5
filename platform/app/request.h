#pragma once
// The record behind app_control_h, for the framework's own sources.
#include "app/app_control.h"
#include <functional>
#include <gio/gio.h>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

// Told to the sender of a request that an ending application has not looked at: start it anew. No public result.
constexpr auto RESULT_LEAVING = static_cast<app_control_result_e>(1);

// The way back to a sender who may wait. One answer is given; when the last holder goes away without, it is CANCELED.
class Answer {
  public:
    // `reply` may be null.
    using Send = std::function<void(const app_control_s *reply, app_control_result_e result)>;
    explicit Answer(Send to);
    ~Answer();
    Answer(const Answer &) = delete;
    Answer &operator=(const Answer &) = delete;
    // False when an answer was given before.
    bool give(const app_control_s *reply, app_control_result_e result);

  private:
    Send send;
};

struct Extra {
    std::string key;
    bool array = false;
    std::vector<std::string> values; // exactly one unless `array`
};

struct app_control_s {
    std::optional<std::string> operation;
    std::optional<std::string> uri;
    std::optional<std::string> mime;
    std::optional<std::string> app_id;
    unsigned int window = 0;
    std::vector<Extra> extra;
    bundle text;                    // what app_control_to_bundle gave last
    std::shared_ptr<Answer> answer; // null for a request of our own

    // Null when there is no such key.
    const Extra *find(const std::string &key) const;
    void set(const std::string &key, bool array, std::vector<std::string> values);
};

// The request as a{sv} (a floating reference) and back; entries of unknown names or types are passed over.
// "operation", "uri", "mime", "app-id": ay with a final NUL; "window": u; "extra": a(aybaay), key, array or not,
// values.
GVariant *request_to_variant(const app_control_s &request);
void request_from_variant(GVariant *dictionary, app_control_s &request);
