#pragma once
// Reading the XML bodies of WebDAV requests (RFC 4918, 14) with libxml2, and writing text into XML.
#include "metadata.h"

struct PropfindBody {
    enum Kind { ALL, NAMES, NAMED } kind = ALL;
    DeadProperties properties; // NAMED: those asked for; ALL: those asked for besides. Without xml.
};
struct PropertyUpdate {
    DeadProperty property; // without xml when it is to be removed
    bool remove = false;
};

// An empty body asks for all. False when the body is not a well-formed propfind element.
bool read_propfind(const std::string &body, PropfindBody &propfind);
// The instructions in document order. False when the body is not a well-formed propertyupdate element.
bool read_proppatch(const std::string &body, std::vector<PropertyUpdate> &updates);
// False when the body is not the lockinfo element of a write lock. `owner` is its owner element, or empty.
bool read_lockinfo(const std::string &body, bool &exclusive, std::string &owner);
// Appends text so that it can stand between tags and in attributes; what XML cannot hold becomes U+FFFD.
void append_text(std::string &out, std::string_view text);
// Appends an empty element of any namespace, declared on the element itself.
void append_empty_element(std::string &out, const DeadProperty &property);
