#pragma once

// Names for clang's thread-safety analysis: a serial queue is a capability, and so are a mutex and a thread; state is
// guarded by one of them, and the on-queue assertion tells the analysis what the process checks at run time. Other
// compilers see nothing.

#if defined(__clang__)
#define CORVANE_THREAD_ANNOTATION(x) __attribute__((x))
#else
#define CORVANE_THREAD_ANNOTATION(x)
#endif

#define CORVANE_CAPABILITY(name) CORVANE_THREAD_ANNOTATION(capability(name))
#define CORVANE_GUARDED_BY(queue) CORVANE_THREAD_ANNOTATION(guarded_by(queue))
#define CORVANE_PT_GUARDED_BY(queue) CORVANE_THREAD_ANNOTATION(pt_guarded_by(queue))
#define CORVANE_REQUIRES(...) CORVANE_THREAD_ANNOTATION(requires_capability(__VA_ARGS__))
#define CORVANE_ASSERT_CAPABILITY(...) CORVANE_THREAD_ANNOTATION(assert_capability(__VA_ARGS__))
#define CORVANE_SCOPED_CAPABILITY CORVANE_THREAD_ANNOTATION(scoped_lockable)
#define CORVANE_ACQUIRE(...) CORVANE_THREAD_ANNOTATION(acquire_capability(__VA_ARGS__))
#define CORVANE_ACQUIRE_SHARED(...) CORVANE_THREAD_ANNOTATION(acquire_shared_capability(__VA_ARGS__))
#define CORVANE_RELEASE(...) CORVANE_THREAD_ANNOTATION(release_generic_capability(__VA_ARGS__))
#define CORVANE_RELEASE_SHARED(...) CORVANE_THREAD_ANNOTATION(release_shared_capability(__VA_ARGS__))
#define CORVANE_EXCLUDES(...) CORVANE_THREAD_ANNOTATION(locks_excluded(__VA_ARGS__))
#define CORVANE_NO_THREAD_ANALYSIS CORVANE_THREAD_ANNOTATION(no_thread_safety_analysis)
