// What the thread sanitizer must not report. It asks for these functions by name.

#ifdef __SANITIZE_THREAD__

extern "C" {

// The child of a program with threads has only the one that forked.
const char *__tsan_default_options() {
    return "report_thread_leaks=0";
}

// tzset() takes a lock inside the C library, which the sanitizer does not see.
const char *__tsan_default_suppressions() {
    return "race:tzset_internal";
}

} // extern "C"

#endif
