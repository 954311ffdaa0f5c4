#pragma once

#include <sys/types.h>

namespace searchd {

// Whether a client with this effective user id may change indexes: root, the daemon's own user and
// the user "Velkor" may, if the user database knows one.
bool MayChangeIndexes(uid_t client);

}  // namespace searchd
