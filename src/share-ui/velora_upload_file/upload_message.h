#pragma once
// A text of the view's pipe, taken apart.
#include <string>

// "update.3.7" is a verb, a number and a run; "end.7" has no number, "thumb.9" no run. A text without a run means the
// one that is under way.
struct Message {
    std::string verb;
    bool has_number = false;
    long number = 0; // what the verb is about
    int run = 0;     // 0: not said
};

// Whether the number of such a message is a file's place in its run.
bool __is_of_item(const std::string &verb);

// buffer: size bytes, of which those before the first NUL count. Pieces that are no numbers are 0. Any thread.
Message __message_read(const void *buffer, unsigned int size);
