// The fake library, as a backend of the contract.
#include "backend.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "fake_cloud.h"

namespace {

class Fake : public Backend {
  public:
    explicit Fake(const Wish &wish)
    {
        fake_cloud_reset();
        // An upload takes long enough to be cancelled in its middle.
        std::vector<int> percentages;
        for (int percentage = 0; percentage <= 100; percentage += 5)
            percentages.push_back(percentage);
        fake_cloud_set_percentages(percentages);
        fake_cloud_set_delay(2);
        if (wish.quota)
            fake_cloud_fail_upload(1, CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL);
    }
    Ability ability() const override
    {
        return {false, true, {}};
    }
    void make_folder(const std::string &path) override
    {
        fake_cloud_add_folder(path);
    }
    void store(const std::string &path, const std::string &bytes) override
    {
        fake_cloud_add_file(path, bytes);
    }
    void remove(const std::string &path) override
    {
        fake_cloud_remove(path);
    }
    std::optional<std::string> content(const std::string &path) override
    {
        return fake_cloud_content(path);
    }
    std::vector<std::string> list(const std::string &folder) override
    {
        return fake_cloud_list(folder);
    }
    void go_down() override
    {
        fake_cloud_set_reachable(false);
    }
};

} // namespace

std::vector<std::string> backend_names()
{
    return {"Fake"};
}

std::unique_ptr<Backend> start_backend(const std::string &, const Wish &wish)
{
    return wish.lose_reply || wish.fail_status ? nullptr : std::make_unique<Fake>(wish);
}
