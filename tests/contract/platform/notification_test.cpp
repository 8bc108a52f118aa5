// The store alone: no bus is in the environment.
#include "dlog/dlog.h"
#include "notification/notification.h"
#include "support.h"
#include <thread>
#include <vector>

namespace {

constexpr const char *PACKAGE = "com.example.poster";

class Notification : public PlatformTest {
  protected:
    void SetUp() override
    {
        PlatformTest::SetUp();
        unsetenv("DBUS_SESSION_BUS_ADDRESS");
        unsetenv("XDG_RUNTIME_DIR");
        platform_package_set(PACKAGE);
    }
};

struct Free {
    void operator()(notification_h noti) const
    {
        notification_free(noti);
    }
};
using Handle = std::unique_ptr<notification_s, Free>;

int post(notification_type_e type, const char *title, int flags = 0, const char *package = PACKAGE)
{
    const Handle noti(notification_create(type));
    notification_set_text(noti.get(), NOTIFICATION_TEXT_TYPE_TITLE, title, nullptr, NOTIFICATION_VARIABLE_TYPE_NONE);
    notification_set_property(noti.get(), flags);
    notification_set_pkgname(noti.get(), package);
    int id = 0;
    EXPECT_EQ(notification_insert(noti.get(), &id), NOTIFICATION_ERROR_NONE);
    return id;
}

std::string text(notification_h noti, notification_text_type_e type)
{
    char *value = nullptr;
    EXPECT_EQ(notification_get_text(noti, type, &value), NOTIFICATION_ERROR_NONE);
    return taken(value);
}

std::string titles(const char *package)
{
    std::string all;
    const auto add = [](notification_h noti, int, void *data) {
        *static_cast<std::string *>(data) += text(noti, NOTIFICATION_TEXT_TYPE_TITLE) + " ";
        return true;
    };
    notification_foreach(package, add, &all);
    return all;
}

} // namespace

TEST_F(Notification, EverythingSetComesBack)
{
    const Handle noti(notification_create(NOTIFICATION_TYPE_ONGOING));
    bundle launch{"{'operation': <'x'>}"};
    EXPECT_EQ(notification_set_property(noti.get(), 0x104), 0);
    EXPECT_EQ(notification_set_layout(noti.get(), NOTIFICATION_LY_ONGOING_PROGRESS), 0);
    EXPECT_EQ(notification_set_display_applist(noti.get(), 9), 0);
    EXPECT_EQ(notification_set_image(noti.get(), NOTIFICATION_IMAGE_TYPE_ICON, "/icon.png"), 0);
    EXPECT_EQ(
        notification_set_execute_option(noti.get(), NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH, nullptr, nullptr, &launch),
        0);
    const notification_text_type_e types[] = {NOTIFICATION_TEXT_TYPE_TITLE, NOTIFICATION_TEXT_TYPE_CONTENT,
                                              NOTIFICATION_TEXT_TYPE_INFO_1, NOTIFICATION_TEXT_TYPE_INFO_SUB_2};
    for (const auto type : types)
        EXPECT_EQ(notification_set_text(noti.get(), type, std::to_string(type).c_str(), nullptr,
                                        NOTIFICATION_VARIABLE_TYPE_NONE),
                  0);
    launch.text = "changed later";
    int id = 0;
    ASSERT_EQ(notification_insert(noti.get(), &id), 0);
    EXPECT_GT(id, 0);

    const Handle loaded(notification_load(PACKAGE, id));
    ASSERT_NE(loaded, nullptr);
    int number = 0;
    notification_type_e type = NOTIFICATION_TYPE_NONE;
    notification_ly_type_e layout = NOTIFICATION_LY_NONE;
    bundle *request = nullptr;
    char *image = nullptr;
    EXPECT_EQ(notification_get_property(loaded.get(), &number), 0);
    EXPECT_EQ(number, 0x104);
    EXPECT_EQ(notification_get_display_applist(loaded.get(), &number), 0);
    EXPECT_EQ(number, 9);
    EXPECT_EQ(notification_get_type(loaded.get(), &type), 0);
    EXPECT_EQ(type, NOTIFICATION_TYPE_ONGOING);
    EXPECT_EQ(notification_get_layout(loaded.get(), &layout), 0);
    EXPECT_EQ(layout, NOTIFICATION_LY_ONGOING_PROGRESS);
    EXPECT_EQ(notification_get_image(loaded.get(), NOTIFICATION_IMAGE_TYPE_ICON, &image), 0);
    EXPECT_EQ(taken(image), "/icon.png");
    EXPECT_EQ(notification_get_execute_option(loaded.get(), NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH, &request), 0);
    ASSERT_NE(request, nullptr);
    EXPECT_EQ(request->text, "{'operation': <'x'>}");
    for (const auto t : types)
        EXPECT_EQ(text(loaded.get(), t), std::to_string(t));
}

TEST_F(Notification, DeletingAndUpdatingWhatIsGone)
{
    const int first = post(NOTIFICATION_TYPE_NOTI, "one");
    const int ongoing = post(NOTIFICATION_TYPE_ONGOING, "two");
    post(NOTIFICATION_TYPE_NOTI, "other", 0, "com.example.other");
    EXPECT_EQ(titles(PACKAGE), "one two ");
    EXPECT_EQ(titles(nullptr), "one two other ");
    EXPECT_EQ(notification_load("com.example.other", first), nullptr);

    const Handle noti(notification_load(PACKAGE, first));
    EXPECT_EQ(notification_delete_all_by_type(PACKAGE, NOTIFICATION_TYPE_NOTI), 0);
    EXPECT_EQ(titles(nullptr), "two other ");
    EXPECT_EQ(notification_update_content(noti.get(), first, "x"), NOTIFICATION_ERROR_NOT_EXIST_ID);
    EXPECT_EQ(notification_update_progress(noti.get(), first, 0.5), NOTIFICATION_ERROR_NOT_EXIST_ID);
    EXPECT_EQ(notification_delete(noti.get()), NOTIFICATION_ERROR_NOT_EXIST_ID);
    const int newest = post(NOTIFICATION_TYPE_NOTI, "newest");
    EXPECT_EQ(notification_delete_all_by_type(PACKAGE, NOTIFICATION_TYPE_NOTI), 0);
    EXPECT_GT(post(NOTIFICATION_TYPE_NOTI, "new"), newest); // an id is not used again
    EXPECT_EQ(notification_load(PACKAGE, first), nullptr);
    EXPECT_EQ(notification_load(PACKAGE, 0), nullptr);
    EXPECT_EQ(notification_create(NOTIFICATION_TYPE_NONE), nullptr);

    const Handle two(notification_load(PACKAGE, ongoing));
    const struct {
        double given, kept;
    } cases[] = {{0.25, 0.25}, {-1, 0}, {7, 1}};
    for (const auto &c : cases) {
        EXPECT_EQ(notification_update_progress(two.get(), ongoing, c.given), 0);
        double progress = -1;
        notification_get_progress(Handle(notification_load(PACKAGE, ongoing)).get(), &progress);
        EXPECT_EQ(progress, c.kept);
    }
}

TEST_F(Notification, VolatileOnesEndWithTheMachinesStart)
{
    const int lasting = post(NOTIFICATION_TYPE_NOTI, "lasting");
    const int fleeting = post(NOTIFICATION_TYPE_NOTI, "fleeting", NOTIFICATION_PROP_VOLATILE_DISPLAY);
    EXPECT_EQ(titles(PACKAGE), "lasting fleeting ");
    Db db;
    ASSERT_TRUE(db.open(platform_data_dir() + "/notifications.db", nullptr));
    ASSERT_TRUE(db.run("UPDATE notification SET boot = 'an earlier start' WHERE boot IS NOT NULL"));
    EXPECT_EQ(titles(PACKAGE), "lasting ");
    EXPECT_EQ(notification_load(PACKAGE, fleeting), nullptr);
    EXPECT_NE(Handle(notification_load(PACKAGE, lasting)), nullptr);
}

TEST_F(Notification, StatusMessageGoesToTheLogWithoutABus)
{
    std::string logged;
    dlog_set_sink([](int, const char *, const char *text, void *data) { *static_cast<std::string *>(data) += text; },
                  &logged);
    EXPECT_EQ(notification_status_message_post("No application"), 0);
    dlog_set_sink(nullptr, nullptr);
    EXPECT_EQ(logged, "No application");
}

TEST_F(Notification, ThreeThreadsAtOnce)
{
    const int id = post(NOTIFICATION_TYPE_ONGOING, "run");
    std::vector<std::thread> threads;
    for (int n = 0; n < 3; n++)
        threads.emplace_back([id, n] {
            for (int i = 1; i <= 100; i++) {
                const Handle noti(notification_load(PACKAGE, id));
                ASSERT_NE(noti, nullptr);
                if (n == 0)
                    EXPECT_EQ(notification_update_content(noti.get(), id, std::to_string(i).c_str()), 0);
                else
                    EXPECT_EQ(notification_update_progress(noti.get(), id, i / 100.0), 0);
                if (n == 1 && i % 10 == 0)
                    post(NOTIFICATION_TYPE_NOTI, "result");
            }
        });
    for (auto &thread : threads)
        thread.join();
    const Handle noti(notification_load(PACKAGE, id));
    double progress = 0;
    notification_get_progress(noti.get(), &progress);
    EXPECT_EQ(progress, 1.0);
    EXPECT_EQ(text(noti.get(), NOTIFICATION_TEXT_TYPE_CONTENT), "100");
}
