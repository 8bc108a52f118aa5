#pragma once
// The launch requests that were received, each of them until it is answered.
//
// A reply is expected by whoever shares, by the setup wizard, and by everyone while the settings application's cloud
// page waits. Requests are known by numbers, which are never given out twice; 0 stands for none. Main loop only.
#include "velora_common/velora_app_data.h"
#include <string>
#include <vector>

// Keeps a clone of a request, which becomes the last one and AppData's `app_control`. Its number.
int _velora_request_add(AppData *ad, app_control_h request);
// The number of the last request that was added, also when it is answered by now.
int _velora_request_last();
// What the last request turned out to be, from AppData's launch_mode and is_share.
void _velora_request_note_mode(const AppData *ad);

// Extra data "result" of the reply to a request (copied; null: none).
void _velora_request_result_set(int number, const char *result);

// The last request is a share that could not be taken yet, for want of a network.
void _velora_request_hold_last();
// The first share that is held, or null. It is the library's until it is answered.
app_control_h _velora_request_held();
// The first held share is taken now, but for `refused`, some paths of it that are not uploaded, and of `others` that
// are: its sender finds them in the reply, as the array "refused". With no others it is answered, as one that failed.
// Its number.
int _velora_request_held_taken(AppData *ad, std::vector<std::string> refused, size_t others);
// More paths of a share, answered or not, that are not uploaded.
void _velora_request_refused_add(int number, std::vector<std::string> refused);

// Answers a request if it expects an answer, and forgets it.
void _velora_request_answer(AppData *ad, int number, app_control_result_e result);
// A request came to its end without a page, or its page is gone: answers it. With no page left the application ends.
void _velora_request_finish(AppData *ad, int number);
// The person does not want to wait for a network: leaves the application, or, where a page has other files that would
// be dropped with it, answers the shares that are held.
void _velora_requests_finish_held(AppData *ad);
// The application ends: every request is answered as one that was dealt with.
void _velora_requests_answer_all(AppData *ad);
