#pragma once
// The store of notifications; for the library, its agent and its tool. Any thread may call.
#include "notification/notification.h"
#include <array>
#include <optional>
#include <string>
#include <vector>

struct notification_s {
    using Text = std::optional<std::string>;
    int id = 0; // 0 until it is posted
    std::string package;
    int type = NOTIFICATION_TYPE_NOTI;
    int flags = 0;
    int layout = NOTIFICATION_LY_NONE;
    int places = NOTIFICATION_DISPLAY_APP_NOTIFICATION_TRAY;
    double progress = 0.0;
    std::array<Text, 4> texts;  // in the order of text_index
    std::array<Text, 2> images; // by notification_image_type_e
    std::optional<bundle> launch;
    Text heir;
    bool closed = false; // the daemon took it off the screen
};

// The place of a text in `texts`, or -1 for a number that is no notification_text_type_e.
int text_index(int type);

bool store_insert(notification_s &noti); // gives it its id
// null: all packages, 0: all ids; a list of all leaves out those that store_forget_orphans would take away
std::vector<notification_s> store_list(const char *package, int id = 0);
// Takes away the ongoing notifications of processes that ended without doing so, or puts their heirs in their place;
// true when there were any.
bool store_forget_orphans();
// These three are false when there is no such notification or the store fails; `failed` tells which.
bool store_set_content(const std::string &package, int id, const char *content, bool &failed);
bool store_set_progress(const std::string &package, int id, double progress, bool &failed);
bool store_delete(const std::string &package, int id, bool &failed);
bool store_delete_type(const std::string &package, int type); // NOTIFICATION_TYPE_NONE: both
void store_set_closed(int id);
// A number that changes when another connection has written.
long long store_version();
