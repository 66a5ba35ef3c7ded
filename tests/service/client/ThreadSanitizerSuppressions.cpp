// Compiled in, so that they hold however the program is started. Only for libraries that are not
// instrumented themselves.

#if defined(__has_feature)
#if __has_feature(thread_sanitizer)

extern "C" const char* __tsan_default_suppressions(); // NOLINT(bugprone-reserved-identifier)

extern "C" const char* __tsan_default_suppressions() // NOLINT(bugprone-reserved-identifier)
{
    // The HTTP library of the development STS keeps a table of method names that the first
    // request fills, under the guard of a local static. The guard's fast path is inline code of
    // the library, which the sanitizer does not see; the comparisons in later requests it does.
    return "called_from_lib:libcpp-httplib.so\n";
}

#endif
#endif
