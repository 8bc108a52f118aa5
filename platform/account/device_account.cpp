// Puts accounts into the device's account database, or takes them away, from a shell.
#include "account/account.h"
#include "base/base.h"
#include <cstdio>
#include <map>
#include <string_view>

namespace {

constexpr const char *USAGE =
    "Usage: device-account add --package PACKAGE --domain DOMAIN --user USER [--icon FILE]\n"
    "       device-account remove --package PACKAGE\n"
    "       device-account list\n"
    "\n"
    "Sets up the device's account database. \"add\" writes an account with both media capabilities enabled, or\n"
    "brings the account that the package has already up to date, and prints its id.\n"
    "\n"
    "  --package PACKAGE  the application that owns the account\n"
    "  --domain DOMAIN    the service, such as \"Example\"\n"
    "  --user USER        the user name; it is the e-mail address and the displayed name as well\n"
    "  --icon FILE        a picture for lists of accounts\n"
    "  --help             shows this\n"
    "\n"
    "Exit status: 0 done, 1 nothing found or the database failed, 2 wrong arguments.\n";

using Options = std::map<std::string_view, const char *>;

bool keep_id(account_h account, void *user_data)
{
    return account_get_account_id(account, static_cast<int *>(user_data)) != ACCOUNT_ERROR_NONE;
}

int add(Options &options)
{
    account_h account = nullptr;
    account_create(&account);
    const char *user = options["--user"];
    account_set_package_name(account, options["--package"]);
    account_set_domain_name(account, options["--domain"]);
    account_set_user_name(account, user);
    account_set_email_address(account, user);
    account_set_display_name(account, user);
    if (options["--icon"])
        account_set_icon_path(account, options["--icon"]);
    account_set_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, ACCOUNT_CAPABILITY_ENABLED);
    account_set_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_VIDEO, ACCOUNT_CAPABILITY_ENABLED);
    int id = -1;
    account_query_account_by_package_name(keep_id, options["--package"], &id);
    const int result = id > 0 ? account_update_to_db_by_id(account, id) : account_insert_to_db(account, &id);
    account_destroy(account);
    if (result == ACCOUNT_ERROR_NONE)
        std::printf("%d\n", id);
    return result;
}

bool print(account_h account, void *)
{
    int id = -1;
    account_get_account_id(account, &id);
    std::printf("%d", id);
    for (auto get : {account_get_package_name, account_get_domain_name, account_get_user_name}) {
        char *text = nullptr;
        get(account, &text);
        const CString owner(text);
        std::printf("\t%s", text ? text : "");
    }
    std::putchar('\n');
    return true;
}

} // namespace

int main(int argc, char **argv)
{
    const std::string_view command = argc > 1 ? argv[1] : "";
    if (command == "--help" || command == "-h") {
        std::fputs(USAGE, stdout);
        return 0;
    }
    Options options;
    bool usable = argc % 2 == 0;
    for (int i = 2; usable && i < argc; i += 2) {
        const std::string_view name = argv[i];
        const bool known =
            name == "--package" || (command == "add" && (name == "--domain" || name == "--user" || name == "--icon"));
        usable = known && *argv[i + 1];
        options[name] = argv[i + 1];
    }
    if (command == "add")
        usable = usable && options["--package"] && options["--domain"] && options["--user"];
    else if (command == "remove")
        usable = usable && options["--package"];
    else
        usable = usable && command == "list" && options.empty();
    if (!usable) {
        std::fputs(USAGE, stderr);
        return 2;
    }

    int result = account_connect();
    if (result == ACCOUNT_ERROR_NONE) {
        result = command == "add"      ? add(options)
                 : command == "remove" ? account_delete_from_db_by_package_name(options["--package"])
                                       : account_foreach_account_from_db(print, nullptr);
        account_disconnect();
    }
    if (result == ACCOUNT_ERROR_RECORD_NOT_FOUND && command == "list")
        return 0;
    if (result == ACCOUNT_ERROR_RECORD_NOT_FOUND)
        std::fprintf(stderr, "device-account: there is no account\n");
    else if (result != ACCOUNT_ERROR_NONE)
        std::fprintf(stderr, "device-account: the account database failed (%d)\n", result);
    return result == ACCOUNT_ERROR_NONE ? 0 : 1;
}
