// The fake library, as a backend of the contract.
#include "auth_watch.h"
#include "backend.h"
#include "fake_cloud.h"

Names backend_names()
{
    return {"Fake"};
}

Names server_names()
{
    return {};
}

Names page_names()
{
    return backend_names();
}

std::optional<Backend> start_backend(const std::string &)
{
    fake_cloud_reset();
    fake_cloud_set_delay(2); // an upload takes long enough to be cancelled in its middle
    return Backend{.make_folder = fake_cloud_add_folder,
                   .remove = fake_cloud_remove,
                   .store = fake_cloud_add_file,
                   .content = fake_cloud_content,
                   .list = fake_cloud_list,
                   .go_down = [] { fake_cloud_set_reachable(false); },
                   .approve = [](const std::string &) { fake_cloud_approve(USER); },
                   .is_alive = fake_cloud_token_is_alive};
}

// What page tests set.
TEST(FakeSignIn, obeys_its_knobs)
{
    const TempHome home;
    fake_cloud_reset();
    fake_cloud_sign_in("ann@example.org");
    cloud_content_sync_h handle = nullptr;
    ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    EXPECT_EQ(refresh(handle), 0);
    fake_cloud_revoke_tokens();
    EXPECT_EQ(refresh(handle), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);

    fake_cloud_approve(USER);
    fake_cloud_fail_auth(2, CLOUD_CONTENT_SYNC_ERROR_NETWORK);
    EXPECT_EQ(run(handle, Step::REQUEST_TOKEN), 0);
    EXPECT_EQ(run(handle, Step::EMAIL), CLOUD_CONTENT_SYNC_ERROR_NETWORK);
    fake_cloud_hold(true);
    Watch held;
    begin(handle, Step::EMAIL, held);
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    EXPECT_EQ(held.count(), 0u);
    fake_cloud_let_through(1);
    EXPECT_EQ(held.end(), 0);
    fake_cloud_hold(false);
    EXPECT_EQ(fake_cloud_live_tokens(), 1);
    EXPECT_EQ(run(handle, Step::ACTIVATE), 0);
    EXPECT_EQ(run(handle, Step::DEACTIVATE), 0);
    EXPECT_EQ(fake_cloud_live_tokens(), 0);
    cloud_content_sync_destroy(handle);
    fake_cloud_sign_in("");
    EXPECT_EQ(who(), "(null)");
}
