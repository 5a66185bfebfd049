#pragma once

#include <pthread.h>

#include <mutex>

#include "trelm/Export.h"
#include "trelm/ThreadAnnotations.h"

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

// A POSIX mutex as a lock the thread-safety analysis knows. Made unlocked by init() (once, in
// the owner's setup, as every mutex of the plug-in is); destroyed with the object if it was made.
// Not recursive: a thread must not lock it twice.
class TRELM_CAPABILITY("mutex") Mutex {
public:
    Mutex() = default;
    ~Mutex() {
        if (made_) destroyMutex(&mutex_);
    }
    Mutex(Mutex const&) = delete;
    Mutex& operator=(Mutex const&) = delete;

    // 0 on success, else the pthread error number. REQUIRES: not made before.
    int init() {
        int const err = initMutex(&mutex_);
        made_ = err == 0;
        return err;
    }
    bool made() const noexcept { return made_; }

    // 0 on success, else the pthread error number (then the mutex is not held, whatever the
    // analysis assumes: callers check it, as MutexLock::locked() does).
    int lock() TRELM_ACQUIRE() { return lockMutex(&mutex_); }
    void unlock() TRELM_RELEASE() { freeMutex(&mutex_); }

private:
    pthread_mutex_t mutex_;
    bool made_ = false;
};

// A std::mutex as a lock the thread-safety analysis knows, for owners that have no setup step to
// make a Mutex in (its construction cannot fail).
class TRELM_CAPABILITY("mutex") StdMutex {
public:
    void lock() TRELM_ACQUIRE() { mutex_.lock(); }
    void unlock() TRELM_RELEASE() { mutex_.unlock(); }

private:
    std::mutex mutex_;
};

// Holds a StdMutex for a scope.
class TRELM_SCOPED_CAPABILITY StdMutexLock {
public:
    explicit StdMutexLock(StdMutex& mutex) TRELM_ACQUIRE(mutex) : mutex_(mutex) { mutex_.lock(); }
    ~StdMutexLock() TRELM_RELEASE() { mutex_.unlock(); }
    StdMutexLock(StdMutexLock const&) = delete;
    StdMutexLock& operator=(StdMutexLock const&) = delete;

private:
    StdMutex& mutex_;
};

// Holds a Mutex for a scope. If locking failed, locked() is false and nothing is released at the
// end; the caller must then leave without touching the guarded data.
class TRELM_SCOPED_CAPABILITY MutexLock {
public:
    explicit MutexLock(Mutex& mutex) TRELM_ACQUIRE(mutex) : mutex_(mutex), locked_(mutex.lock() == 0) {}
    ~MutexLock() TRELM_RELEASE() {
        if (locked_) mutex_.unlock();
    }
    MutexLock(MutexLock const&) = delete;
    MutexLock& operator=(MutexLock const&) = delete;

    bool locked() const noexcept { return locked_; }

private:
    Mutex& mutex_;
    bool locked_;
};

}  // namespace trelm
