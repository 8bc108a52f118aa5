#pragma once
// Whole runs of the application in a test: its own home, requests as others send them, the framework as a fake.
#include "account/account.h"
#include "base/base.h"
#include "driver.h"
#include "fake_app.h"
#include "temp_home.h"
#include "vconf/vconf.h"
#include "velora_common/velora_app_data.h"
#include <gtest/gtest.h>

int velora_main(int argc, char **argv);

class Application : public testing::Test {
  protected:
    Application()
    {
        driver::start();
        platform_package_set(VELORA_PACKAGE);
        vconf_set_str("memory/connection/type", "wifi");
        fake_app::clear();
    }
    ~Application() override
    {
        fake_app::clear();
    }

    static void run(std::function<void()> script)
    {
        char name[] = "velora";
        char *arguments[] = {name, nullptr};
        fake_app::run(std::move(script));
        velora_main(1, arguments);
    }

    struct Wish {
        const char *operation = nullptr, *launch_mode = nullptr, *uri = nullptr;
        std::vector<std::string> paths;
        const char *display_type = nullptr, *sender = "b", *folder = nullptr;
    };
    static void request(const Wish &wish)
    {
        app_control_h request = fake_app::receive(wish.operation, wish.sender);
        app_control_set_uri(request, wish.uri);
        if (wish.launch_mode)
            app_control_add_extra_data(request, "launch_mode", wish.launch_mode);
        if (wish.display_type)
            app_control_add_extra_data(request, "display_type", wish.display_type);
        if (wish.folder)
            app_control_add_extra_data(request, "folder_path", wish.folder);
        std::vector<const char *> paths;
        for (const std::string &path : wish.paths)
            paths.push_back(path.c_str());
        app_control_add_extra_data_array(request, wish.display_type ? "path" : APP_CONTROL_DATA_PATH, paths.data(),
                                         static_cast<int>(paths.size()));
        fake_app::request(request);
        app_control_destroy(request);
    }
    static void add_account()
    {
        account_h account = nullptr;
        int id = 0;
        account_connect();
        account_create(&account);
        account_set_user_name(account, "ann@example.com");
        account_insert_to_db(account, &id);
        account_destroy(account);
        account_disconnect();
    }

    TempHome home;
    LogCatcher log;
};
