// Calls each family of exported functions and catches the library's errors by type. Prints what is
// wrong and returns 1, or returns 0.
#include <appindex/config.h>
#include <appindex/device_identity.h>
#include <appindex/elastic_control.h>
#include <appindex/error.h>
#include <appindex/index_mgr.h>
#include <appindex/observer.h>
#include <appindex/string_pool.h>
#include <appindex/utilities.h>

#include <cstdio>
#include <string>

namespace {

int failures = 0;

void Expect(bool ok, const char* what) {
  if (ok) return;
  std::fprintf(stderr, "consumer: not true: %s\n", what);
  ++failures;
}

template <typename Call>
velkor::Error Catch(const Call& call) {
  try {
    call();
  } catch (const velkor::Error& error) {
    return error;
  }
  return velkor::Error(0, "nothing was thrown");
}

void CheckErrors() {
  const velkor::Error locked = Catch([] { velkor::LockFile("/no/such/directory/lock", true); });
  Expect(locked.code == velkor::Error::kLockFileError, "a lock that cannot be opened is 506");
  Expect(std::string(locked.what()).rfind("open failed, path=/no/such/directory/lock", 0) == 0,
         "what() is the reason");
  Expect(std::string(locked.std::runtime_error::what()).rfind("Velkor error, code=506", 0) == 0,
         "the base class has the whole message");

  int number = 7;
  const velkor::Error missing = Catch(
      [&number] { velkor::GetJsonValue(number, Json::Value(Json::objectValue), "port", true); });
  Expect(missing.code == velkor::Error::kJsonError && number == 7,
         "a required member that is missing is 120 and leaves the output alone");
  const velkor::Error unsendable =
      Catch([] { velkor::appindex::elastic::IndexUpsert("enu", Json::Value(Json::objectValue)); });
  Expect(unsendable.code == velkor::Error::kJsonError, "a document without an id is 120");
}

void CheckValues() {
  Expect(velkor::appindex::GetSupportedLangs().size() == 21, "there are 21 languages");
  Expect(velkor::appindex::elastic::GetAppIndexID("ger") == "appindex_ger", "the index id of ger");
  Expect(velkor::appindex::IsPassFilter(Json::Value(), true), "no filter lets every device pass");
  velkor::appindex::StringPool pool;
  Expect(pool.GetString("ger", "Backup") == "Backup", "a literal text stands for itself");
  Expect(velkor::Basename("/a/index.conf") == "index.conf", "the last component of a path");
  velkor::appindex::Add("/no/descriptor.txt", true);
  velkor::appindex::Del("/no/descriptor.txt", true);
  velkor::Mutex mutex;
  const velkor::LockMutex lock(mutex);
  Expect(!mutex.TryLock(), "a mutex that is held");
}

class Waits : public velkor::appindex::Observer {
 public:
  Waits() { velkor::appindex::SetObserver(this); }
  ~Waits() override { velkor::appindex::SetObserver(nullptr); }
  int count = 0;

 private:
  void OnRequest(std::size_t, std::size_t) override {}
  void OnWork(std::size_t) override {}
  void OnDocument(const std::string&, const std::string&) override {}
  void OnWait(Wait reason, std::chrono::milliseconds) override {
    if (reason == Wait::kLock && ++count == 1) throw 1;  // enough of waiting
  }
};

void CheckObserver(const std::string& lock_path) {
  const velkor::LockFile held(lock_path, true);
  Waits waits;
  try {
    const velkor::LockFile second(lock_path, true);
    Expect(false, "a lock that is held is waited for");
  } catch (int) {
    Expect(waits.count == 1, "the observer is told of the wait, and may end it");
  }
}

}  // namespace

int main(int, char** argv) {
  CheckErrors();
  CheckValues();
  CheckObserver(argv[0]);  // any file that this may read
  return failures == 0 ? 0 : 1;
}
