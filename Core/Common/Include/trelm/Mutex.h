#pragma once

#include <pthread.h>

#include "trelm/Export.h"

namespace trelm {

// Thin wrappers over POSIX mutexes; each returns 0 on success or the pthread error number.
// initMutex makes a normal (non-recursive) mutex; a thread must not lock it twice.
TRELM_API int initMutex(pthread_mutex_t* mutex);
TRELM_API int lockMutex(pthread_mutex_t* mutex);
// Releases (unlocks) the mutex.
TRELM_API int freeMutex(pthread_mutex_t* mutex);
// REQUIRES: the mutex is unlocked and no thread waits on it.
TRELM_API int destroyMutex(pthread_mutex_t* mutex);

// Holds a mutex locked for a scope. If locking failed, locked() is false and nothing is
// released at the end.
class MutexGuard {
public:
    explicit MutexGuard(pthread_mutex_t* mutex) : mutex_(mutex), locked_(lockMutex(mutex) == 0) {}
    ~MutexGuard() {
        if (locked_) freeMutex(mutex_);
    }
    MutexGuard(MutexGuard const&) = delete;
    MutexGuard& operator=(MutexGuard const&) = delete;

    bool locked() const noexcept { return locked_; }

private:
    pthread_mutex_t* mutex_;
    bool locked_;
};

}  // namespace trelm
