#pragma once

// Names for clang's thread-safety analysis: a serial queue is a capability, state that lives on a
// queue is guarded by it, and the on-queue assertion tells the analysis what the process checks at
// run time. Other compilers see nothing.

#if defined(__clang__)
#define CORVANE_THREAD_ANNOTATION(x) __attribute__((x))
#else
#define CORVANE_THREAD_ANNOTATION(x)
#endif

#define CORVANE_CAPABILITY(name) CORVANE_THREAD_ANNOTATION(capability(name))
#define CORVANE_GUARDED_BY(queue) CORVANE_THREAD_ANNOTATION(guarded_by(queue))
#define CORVANE_REQUIRES(...) CORVANE_THREAD_ANNOTATION(requires_capability(__VA_ARGS__))
#define CORVANE_ASSERT_CAPABILITY(...) CORVANE_THREAD_ANNOTATION(assert_capability(__VA_ARGS__))
#define CORVANE_NO_THREAD_ANALYSIS CORVANE_THREAD_ANNOTATION(no_thread_safety_analysis)
