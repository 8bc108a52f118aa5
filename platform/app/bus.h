#pragma once
// Launch requests over the session bus, for the framework's own sources. Main thread only.
#include "app/request.h"

enum class Role {
    alone,  // there is no session bus
    first,  // this process owns its id: requests come here
    second, // another process owns it
};

// Takes the process's id and aliases on the bus. `receive` gets each request that arrives from then on, from the main
// context's dispatch; it becomes the handle's owner.
Role bus_own(std::function<void(app_control_h)> receive);

// Keeps `answer` so that bus_stop gives it CANCELED if nobody else answers.
void bus_watch_answer(const std::shared_ptr<Answer> &answer);

// Gives the ids back, answers whoever still waits, and sees requests of ours on their way (at most `patience` seconds,
// for a program that is being started). To be called once, when the main loop has ended.
void bus_stop(int patience);

// This process's id and its aliases.
std::vector<std::string> bus_own_ids();

// The session bus, or null. The reference belongs to this library.
GDBusConnection *bus_connection();
// True when somebody owns the name now, or the bus knows how to start its owner.
bool bus_name_owned(const std::string &name);
bool bus_name_activatable(const std::string &name);
// "com.example.a-b" gives "/com/example/a_b".
std::string bus_path(const std::string &app_id);

// The error by which an application that is about to end turns a request down: start it anew.
#define BUS_ERROR_LEAVING "com.orvant.AppControl.Error.Leaving"

// The receiving half of bus_stop.
void bus_give_back();
