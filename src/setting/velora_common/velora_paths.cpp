#include "velora_common/velora_paths.h"
#include "velora_config.h"
#include <cstdlib>
#include <filesystem>

namespace fs = std::filesystem;

static std::string __find_app_root()
{
    std::error_code failed;
    const fs::path program = fs::read_symlink("/proc/self/exe", failed);
    for (fs::path dir = program.parent_path(); !failed && dir.has_relative_path(); dir = dir.parent_path())
        if (fs::exists(dir / "res/edje/velora.edj", failed))
            return dir;
    return VELORA_APP_ROOT;
}

const std::string &_velora_common_app_root()
{
    static const std::string root = __find_app_root();
    return root;
}

std::string _velora_common_app_file(const char *relative)
{
    return _velora_common_app_root() + "/" + relative;
}

std::string _velora_common_media_root()
{
    const char *set = std::getenv("VELORA_MEDIA_ROOT");
    return set && *set == '/' ? set : VELORA_MEDIA_ROOT;
}
