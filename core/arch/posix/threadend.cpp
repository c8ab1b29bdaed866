#include <pthread.h>

#include "core/arch/threadend_p.h"

static_assert(sizeof(pthread_key_t) == sizeof(unsigned));

ThreadEnd::ThreadEnd(void (*action)(void*)) : made_(pthread_key_create(&key_, action) == 0) {}

bool ThreadEnd::set(void* pointer) const { return made_ && pthread_setspecific(key_, pointer) == 0; }
