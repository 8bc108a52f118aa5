// The fake library, as a backend of the contract.
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
