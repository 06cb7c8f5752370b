#pragma once

// Names for clang's thread-safety analysis; nothing elsewhere.
#if defined(__clang__)
#define ZK_ATTRIBUTE(x) __attribute__((x))
#else
#define ZK_ATTRIBUTE(x)
#endif

#define ZK_CAPABILITY(name) ZK_ATTRIBUTE(capability(name))
// The field belongs to that queue: touched only by operations that run on it.
#define ZK_ON(queue) ZK_ATTRIBUTE(guarded_by(queue))
// The field is protected by that mutex.
#define ZK_GUARDED_BY(mutex) ZK_ATTRIBUTE(guarded_by(mutex))
#define ZK_ASSERTS(...) ZK_ATTRIBUTE(assert_capability(__VA_ARGS__))
#define ZK_ASSERTS_SHARED(...) ZK_ATTRIBUTE(assert_shared_capability(__VA_ARGS__))
#define ZK_REQUIRES(...) ZK_ATTRIBUTE(requires_capability(__VA_ARGS__))
#define ZK_REQUIRES_SHARED(...) ZK_ATTRIBUTE(requires_shared_capability(__VA_ARGS__))
#define ZK_ACQUIRE(...) ZK_ATTRIBUTE(acquire_capability(__VA_ARGS__))
#define ZK_RELEASE(...) ZK_ATTRIBUTE(release_capability(__VA_ARGS__))
#define ZK_SCOPED ZK_ATTRIBUTE(scoped_lockable)
#define ZK_NO_ANALYSIS ZK_ATTRIBUTE(no_thread_safety_analysis)
