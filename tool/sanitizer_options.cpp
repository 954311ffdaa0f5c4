// How AddressSanitizer runs in the program; part of builds with it alone.

// Looking for leaks takes /proc, which a root does not have. The unit tests look for them.
extern "C" __attribute__((visibility("default"), used)) const char* __asan_default_options();

const char* __asan_default_options() { return "detect_leaks=0"; }
