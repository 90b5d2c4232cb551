/// Annotations for clang's thread-safety analysis. They say which lock guards what; other compilers ignore them.

#ifndef COMMON_INCLUDE_THREADANNOTATIONS_H
#define COMMON_INCLUDE_THREADANNOTATIONS_H

#if defined(__clang__)
#define ZT_THREAD_ATTRIBUTE(...) __attribute__((__VA_ARGS__))
#else
#define ZT_THREAD_ATTRIBUTE(...)
#endif

/// On a class: its objects are locks. The argument is the kind's name, such as "mutex".
#define ZT_CAPABILITY(aName) ZT_THREAD_ATTRIBUTE(capability(aName))

/// On a class: its objects hold a lock from construction to destruction.
#define ZT_SCOPED_CAPABILITY ZT_THREAD_ATTRIBUTE(scoped_lockable)

/// On a member: touched only with the lock held.
#define ZT_GUARDED_BY(...) ZT_THREAD_ATTRIBUTE(guarded_by(__VA_ARGS__))

/// On a pointer member: what it points to is touched only with the lock held.
#define ZT_PT_GUARDED_BY(...) ZT_THREAD_ATTRIBUTE(pt_guarded_by(__VA_ARGS__))

/// On a function: the caller holds the lock.
#define ZT_REQUIRES(...) ZT_THREAD_ATTRIBUTE(requires_capability(__VA_ARGS__))

/// On a function: takes the lock and returns with it held.
#define ZT_ACQUIRE(...) ZT_THREAD_ATTRIBUTE(acquire_capability(__VA_ARGS__))

/// On a function: gives up the lock.
#define ZT_RELEASE(...) ZT_THREAD_ATTRIBUTE(release_capability(__VA_ARGS__))

/// On a function: takes the lock where it returns the first argument.
#define ZT_TRY_ACQUIRE(...) ZT_THREAD_ATTRIBUTE(try_acquire_capability(__VA_ARGS__))

/// On a function: the caller does not hold the lock, since the function takes it.
#define ZT_EXCLUDES(...) ZT_THREAD_ATTRIBUTE(locks_excluded(__VA_ARGS__))

/// On a function: what it returns is the lock of the argument.
#define ZT_RETURN_CAPABILITY(...) ZT_THREAD_ATTRIBUTE(lock_returned(__VA_ARGS__))

/// On a function: its body is not analyzed. A comment beside it says why.
#define ZT_NO_THREAD_SAFETY_ANALYSIS ZT_THREAD_ATTRIBUTE(no_thread_safety_analysis)

#endif
