#include "trelm/Mutex.h"

namespace trelm {

int initMutex(pthread_mutex_t* mutex) { return pthread_mutex_init(mutex, nullptr); }
int lockMutex(pthread_mutex_t* mutex) { return pthread_mutex_lock(mutex); }
int freeMutex(pthread_mutex_t* mutex) { return pthread_mutex_unlock(mutex); }
int destroyMutex(pthread_mutex_t* mutex) { return pthread_mutex_destroy(mutex); }

}  // namespace trelm
