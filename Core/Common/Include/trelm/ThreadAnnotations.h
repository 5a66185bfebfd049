#pragma once

// Clang's thread-safety annotations, as macros that are empty for other compilers. They state in
// the code which lock guards which data and which functions expect a lock held; a clang build
// with -Wthread-safety checks them (scripts/test.sh runs one over the plug-in).
//
//   class Counter {
//       Mutex mutex_;
//       unsigned value_ TRELM_GUARDED_BY(mutex_) = 0;
//       void bumpLocked() TRELM_REQUIRES(mutex_);
//   };

#if defined(__clang__)
#define TRELM_THREAD_ANNOTATION(x) __attribute__((x))
#else
#define TRELM_THREAD_ANNOTATION(x)
#endif

// A class that is a lock.
#define TRELM_CAPABILITY(name) TRELM_THREAD_ANNOTATION(capability(name))
// A class whose objects hold a lock for their lifetime.
#define TRELM_SCOPED_CAPABILITY TRELM_THREAD_ANNOTATION(scoped_lockable)
// Data read or written only with the lock held.
#define TRELM_GUARDED_BY(lock) TRELM_THREAD_ANNOTATION(guarded_by(lock))
// A pointer (or smart pointer) whose pointee is read or written only with the lock held.
#define TRELM_PT_GUARDED_BY(lock) TRELM_THREAD_ANNOTATION(pt_guarded_by(lock))
// A function the caller must call with the locks held.
#define TRELM_REQUIRES(...) TRELM_THREAD_ANNOTATION(requires_capability(__VA_ARGS__))
// A function the caller must call without the locks (it takes them itself).
#define TRELM_EXCLUDES(...) TRELM_THREAD_ANNOTATION(locks_excluded(__VA_ARGS__))
// A function that takes / releases the locks.
#define TRELM_ACQUIRE(...) TRELM_THREAD_ANNOTATION(acquire_capability(__VA_ARGS__))
#define TRELM_RELEASE(...) TRELM_THREAD_ANNOTATION(release_capability(__VA_ARGS__))
// A function the analysis does not follow (say why beside it).
#define TRELM_NO_THREAD_SAFETY_ANALYSIS TRELM_THREAD_ANNOTATION(no_thread_safety_analysis)
