#include "host/searchd/storage_error.h"

namespace searchd {

RequestError StorageError(const std::string& path, const Xapian::Error& error) {
  const bool locked = error.get_type() == std::string("DatabaseLockError");
  return {locked ? Code::kBusy : Code::kStorage, path + ": " + error.get_description()};
}

}  // namespace searchd
