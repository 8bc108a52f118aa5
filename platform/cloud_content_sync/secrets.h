#pragma once
// Secrets in the session's Secret Service (org.freedesktop.secrets). Nothing here ever shows a prompt: a keyring that
// is locked and wants one counts as none. Each function waits for at most a few seconds in all, and a service that let
// it wait so long is left alone for a while. With CLOUD_SECRETS=file in the environment, or without a session bus,
// nobody is asked. Any thread.
#include <string>

namespace cloud {

// Keeps a secret for whoever reads `file`, the path of a file that names the item. The result is the item, a word of
// its own for each call; "" when the secret cannot be kept there. service and account are for people who look into
// their keyring.
std::string secret_store(const std::string &file, const std::string &service, const std::string &account,
                         const std::string &secret);
// "" when there is none, or it is not to be had now. The last one is kept in memory for the next call.
std::string secret_find(const std::string &file, const std::string &item);
// Removes one item of the file, or with an empty item all of them.
void secret_remove(const std::string &file, const std::string &item);

} // namespace cloud
