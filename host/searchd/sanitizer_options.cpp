// How AddressSanitizer runs in the daemon; part of builds with it alone.

// Looking for leaks takes /proc, which a root does not have. Xapian deletes an object of its own
// through a base class when it checks a database.
extern "C" __attribute__((visibility("default"), used)) const char* __asan_default_options();

const char* __asan_default_options() { return "detect_leaks=0:new_delete_type_mismatch=0"; }
