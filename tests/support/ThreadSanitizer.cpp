#if defined(__SANITIZE_THREAD__)

/// Read by the sanitizer's run time. The C library guards its time zone with a lock of its own that
/// the sanitizer does not see; opening an archive converts the dates of its entries.
extern "C" const char* __tsan_default_suppressions();
extern "C" const char* __tsan_default_suppressions() {
    return "race:tzset_internal\n";
}

#endif
