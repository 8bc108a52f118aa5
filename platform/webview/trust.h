#pragma once
#include "origin.h"
#include <gio/gio.h>

enum class Trust { good, bad, unreachable, cancelled };

// Main loop; exactly once, later. `certificate` is null unless it is good; `text` says why not, for logs.
typedef void (*TrustFunction)(Trust trust, GTlsCertificate *certificate, const char *text, void *data);

// Connects to the origin, to see whether its certificate is one that `ca_file` vouches for. Sends nothing over it.
void trust_ask(const Origin &origin, const std::string &ca_file, GCancellable *cancellable, TrustFunction done,
               void *data);

// Whether the certificates of `ca_file` vouch for this one, as that of the origin's host.
bool trust_check(GTlsCertificate *certificate, const Origin &origin, const std::string &ca_file);
