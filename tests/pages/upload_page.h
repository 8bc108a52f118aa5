#pragma once
// The upload view inside a whole run of the application: real widgets, real notifications, a cloud that the test steps.
#include "application.h"
#include "fake_cloud.h"
#include "posted.h"
#include "velora_common/velora_current_popup.h"
#include "velora_upload_file/upload_cancel.h"
#include "velora_upload_file/upload_path_bar.h"
#include "velora_upload_file/upload_row.h"
#include "velora_upload_file/upload_select.h"
#include "velora_upload_file/upload_state.h"
#include "velora_upload_file/upload_waiting.h"
#include "velora_upload_file/velora_upload_view.h"

#include <algorithm>
#include <clocale>
#include <fstream>
#include <map>

class UploadPage : public Application {
  protected:
    void SetUp() override
    {
        setlocale(LC_ALL, "C.UTF-8");
        setenv("LANGUAGE", "en", 1);
        add_account();
        fake_cloud_reset();
        driver::exit_requested();
        for (const char *folder : {"/Alpha", "/Alpha/Beta", "/Alpha/Beta/Gamma", "/R&D <b>", "/Velora"})
            fake_cloud_add_folder(folder);
        fake_cloud_add_file("/one.jpg", "was there before");
        fake_cloud_refresh_now();
    }
    void TearDown() override
    {
        fake_cloud_hold(false);
        EXPECT_EQ(s_vd, nullptr);
        EXPECT_EQ(fake_cloud_open_handles(), 0);
        driver::settle();
    }

    // One run of the application. A script that has not left it by itself is made to.
    static void run(const std::function<void()> &script)
    {
        Application::run([&script] {
            script();
            if (s_vd)
                _velora_app_exit(s_vd->ad);
            seen_run.reset();
            driver::settle();
        });
    }
    static void request(const Wish &wish)
    {
        Application::request(wish);
        if (s_vd)
            app = s_vd->ad;
        driver::settle();
    }
    // Local files of these names are shared; each holds its own name.
    void share(const std::vector<std::string> &names)
    {
        request({.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = locals(names)});
    }
    void show_result(const std::vector<std::string> &names, const char *display_type, const char *folder = nullptr)
    {
        request({.operation = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT,
                 .paths = locals(names),
                 .display_type = display_type,
                 .folder = folder});
    }
    std::vector<std::string> locals(std::vector<std::string> names) const
    {
        std::filesystem::create_directories(home.path + "/files");
        for (std::string &name : names) {
            const std::string path = home.path + "/files/" + name;
            std::ofstream(path) << name;
            name = path;
        }
        return names;
    }

    static Evas_Object *window()
    {
        return s_vd->ad->win_main;
    }
    static bool shows(const std::string &text)
    {
        driver::settle();
        return ("\n" + driver::read_texts(window())).find("\n" + text + "\n") != std::string::npos;
    }
    static void press_back()
    {
        driver::press(window(), "XF86Back");
    }
    static bool press_done()
    {
        const auto is_ready = [] {
            const UploadViewData *vd = s_vd;
            if (!vd || !vd->done_btn || vd->ad->popup || elm_object_disabled_get(vd->done_btn))
                return false;
            int x = 0, width = 0, window_width = 0; // the page may still be on its way in
            evas_object_geometry_get(vd->done_btn, &x, nullptr, &width, nullptr);
            evas_object_geometry_get(window(), nullptr, nullptr, &window_width, nullptr);
            return x + width <= window_width;
        };
        return wait_for(is_ready) && driver::click(s_vd->done_btn);
    }
    static bool press_popup_button(int number)
    {
        Evas_Object *popup = s_vd->ad->popup;
        return popup && driver::click(elm_object_part_content_get(popup, ("button" + std::to_string(number)).c_str()));
    }
    // Rows get their place when they are drawn.
    void draw()
    {
        driver::save_picture(window(), home.path + "/drawn.png");
    }
    // The nth cancel button from the top.
    bool press_row_cancel(size_t nth)
    {
        draw();
        std::map<int, Evas_Object *> buttons; // by their height on the screen
        while (Evas_Object *button =
                   driver::find_widget(s_vd->genlist, "elm_button", static_cast<int>(buttons.size()))) {
            int y = 0;
            evas_object_geometry_get(button, nullptr, &y, nullptr, nullptr);
            buttons[y] = button;
        }
        return nth < buttons.size() && driver::click(std::next(buttons.begin(), static_cast<long>(nth))->second);
    }
    static Elm_Object_Item *row(int nth)
    {
        Elm_Object_Item *item = elm_genlist_first_item_get(s_vd->genlist);
        while (item && nth-- > 0)
            item = elm_genlist_item_next_get(item);
        return item;
    }
    // Every row as "KIND NAME".
    static std::vector<std::string> rows()
    {
        static const char *const kinds[] = {"file", "queued", "uploaded", "failed"};
        std::vector<std::string> all;
        for (int i = 0; Elm_Object_Item *item = row(i); i++) {
            const ItemData *record = __row_record(item);
            char *folder = nullptr;
            if (record->folder)
                cloud_content_sync_folder_get_name(record->folder, &folder);
            const CString owned(folder);
            all.push_back(folder ? std::string("folder ") + folder
                                 : std::string(kinds[record->type]) + " " + record->name);
        }
        return all;
    }
    // The run that is under way, or was when this was last called.
    static const UploadRun *the_run()
    {
        if (s_vd && s_vd->run)
            seen_run = s_vd->run;
        return seen_run.get();
    }
    static std::vector<int> states()
    {
        std::vector<int> all;
        for (const RunFile &file : the_run()->files)
            all.push_back(file.item->state);
        return all;
    }
    static int ended() // files of the run
    {
        return the_run() ? the_run()->report.success + the_run()->report.fail : 0;
    }
    static bool is_over() // the run has ended and the view knows
    {
        return s_vd && !s_vd->run && s_vd->phase != PHASE_BROWSING;
    }
    static bool popup_is(const char *topic)
    {
        return s_vd->ad->popup && std::string(s_vd->ad->popup_owner.topic) == topic;
    }
    static bool wait_for(const std::function<bool()> &condition, double seconds = 20)
    {
        return driver::run_until(condition, seconds);
    }
    bool wait_for_exit()
    {
        return wait_for([this] { return !s_vd && !app->win_main; });
    }

    static std::vector<std::string> notifications()
    {
        std::vector<std::string> all;
        for (const Posted &one : read_posted(VELORA_SHARE_PACKAGE))
            all.push_back(one.text);
        return all;
    }
    // Every answer as "SENDER RESULT", sorted.
    static std::vector<std::string> answers()
    {
        std::vector<std::string> all;
        for (const fake_app::Reply &reply : fake_app::replies())
            all.push_back(reply.sender + (reply.result == APP_CONTROL_RESULT_SUCCEEDED ? " succeeded" : " canceled"));
        std::ranges::sort(all);
        return all;
    }
    static bool is_answered() // the one who shared
    {
        return fake_app::replies().size() == 1 && fake_app::replies()[0].result == APP_CONTROL_RESULT_SUCCEEDED;
    }
    static std::string uploaded(const std::string &path)
    {
        return fake_cloud_content(path).value_or("(missing)");
    }

    static inline AppData *app; // the one record of the process
    static inline RunHold seen_run;
};

using Texts = std::vector<std::string>;
