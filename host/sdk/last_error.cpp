// Apart from what sets the number, so that a program may define TLIBCErrGet itself and still use
// the other functions.
#include "device/tovo_config.h"
#include "host/sdk/fail.h"

int TLIBCErrGet() { return host::sdk::LastError(); }
