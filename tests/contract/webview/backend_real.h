#pragma once
#include <sys/types.h>

namespace backend {
// The engine's process that shows the pages of this program's last view; 0 when there is none.
pid_t web_process();
} // namespace backend
