// Contract: the device's key-value configuration reader and its version query.
//
// A port provides these functions with C linkage. They may be called from any thread, block only on
// local files and never write beyond the size given.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

// Reads the value of `key` from the configuration file `file` into `value`, a buffer of `size`
// bytes, as a terminated string. A value that does not fit is cut. `flags` is 0 for a plain read;
// no other flag is used. Returns 0 or more on success, and a negative number when the file cannot
// be read or has no such key; the buffer is then left as it was.
int TLIBCFileGetKeyValue(const char* file, const char* key, char* value, int size, int flags);

// Writes a terminated text that identifies the installed system release, as component `component`
// would name it in a user agent, into `text`, a buffer of `size` bytes. Two different releases give
// two different texts, so a text that does not fit is a failure rather than cut. Returns 0 or more
// on success and a negative number on failure.
int TLIBHbinfoUserAgentGet(const char* component, char* text, int size);

// Returns the number of the last error met by one of the device's functions in this thread; 0 when
// there was none. A success leaves it as it was. What the numbers mean is the port's own; none is
// negative.
int TLIBCErrGet(void);

#ifdef __cplusplus
}
#endif
