#include "velora_common/velora_thread.h"
#include "velora_common/velora_log.h"

void _velora_common_create_thread(pthread_t *thread, void *(*start_routine)(void *), void *arg)
{
    pthread_t started;
    if (pthread_create(&started, nullptr, start_routine, arg) != 0) {
        VELORA_LOGE("pthread_create failed");
        return;
    }
    *thread = started;
}
