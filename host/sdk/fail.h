// The error number that the device functions leave behind.
#pragma once

namespace host::sdk {

// Keeps `error`, an errno value, as this thread's last error, sets errno to it and returns -1, the
// result of a device function that failed.
int Fail(int error);

// The number that this thread last gave to Fail; 0 before that.
int LastError();

}  // namespace host::sdk
