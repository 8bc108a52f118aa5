// The store alone: no bus is in the environment.
#include "posted.h"
#include "support.h"
#include <thread>

namespace {

constexpr const char *PACKAGE = "com.example.poster";

class Notification : public PlatformTest {
  protected:
    void SetUp() override
    {
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

// Titles and contents.
std::string texts(const char *package)
{
    std::string all;
    for (const Posted &one : read_posted(package))
        all += one.text + " ";
    return all;
}

} // namespace

TEST_F(Notification, DeletingAndUpdatingWhatIsGone)
{
    const int first = post(NOTIFICATION_TYPE_NOTI, "one");
    const int ongoing = post(NOTIFICATION_TYPE_ONGOING, "two");
    post(NOTIFICATION_TYPE_NOTI, "other", 0, "com.example.other");
    EXPECT_EQ(texts(PACKAGE), "one: (null) two: (null) ");
    EXPECT_EQ(texts(nullptr), "one: (null) two: (null) other: (null) ");
    EXPECT_EQ(notification_load("com.example.other", first), nullptr);

    const Handle noti(notification_load(PACKAGE, first));
    EXPECT_EQ(notification_delete_all_by_type(PACKAGE, NOTIFICATION_TYPE_NOTI), 0);
    EXPECT_EQ(texts(nullptr), "two: (null) other: (null) ");
    EXPECT_EQ(notification_update_content(noti.get(), first, "x"), NOTIFICATION_ERROR_NOT_EXIST_ID);
    EXPECT_EQ(notification_update_progress(noti.get(), first, 0.5), NOTIFICATION_ERROR_NOT_EXIST_ID);
    EXPECT_EQ(notification_delete(noti.get()), NOTIFICATION_ERROR_NOT_EXIST_ID);
    const int newest = post(NOTIFICATION_TYPE_NOTI, "newest");
    EXPECT_EQ(notification_delete_all_by_type(PACKAGE, NOTIFICATION_TYPE_NOTI), 0);
    EXPECT_GT(post(NOTIFICATION_TYPE_NOTI, "new"), newest); // an id is not used again

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
    EXPECT_EQ(texts(PACKAGE), "lasting: (null) fleeting: (null) ");
    ASSERT_TRUE(age_records("notifications.db", "notification"));
    EXPECT_EQ(texts(PACKAGE), "lasting: (null) ");
    EXPECT_EQ(notification_load(PACKAGE, fleeting), nullptr);
    EXPECT_NE(Handle(notification_load(PACKAGE, lasting)), nullptr);
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
    EXPECT_EQ(texts(PACKAGE).find("run: 100 "), 0u);
}
