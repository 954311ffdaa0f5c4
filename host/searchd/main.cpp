// tovoelasticd: the search daemon.
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <optional>

#include "host/device_root.h"
#include "host/searchd/catalog.h"
#include "host/searchd/check_process.h"
#include "host/searchd/dispatcher.h"
#include "host/searchd/durable_file.h"
#include "host/searchd/folding.h"
#include "host/searchd/options.h"
#include "host/searchd/process.h"
#include "host/searchd/server.h"
#include "host/searchd/service_manager.h"
#include "host/searchd/system_log.h"

namespace searchd {
namespace {

constexpr const char* kName = "tovoelasticd";
constexpr const char* kSocketDirectory = "/var/run";
constexpr const char* kSocketPath = "/var/run/tovoelasticd.sock";
constexpr const char* kStateDirectory = "/var/lib/tovoelasticd";
constexpr const char* kLockFile = "/var/lib/tovoelasticd/lock";
constexpr const char* kRegistryFile = "/var/lib/tovoelasticd/indexes.json";

constexpr unsigned kWorkers = 7;
constexpr int kFailure = 1;
constexpr int kWrongUsage = 2;
constexpr int kAlreadyRunning = 3;

// Everything from the entered root on. The socket is the activated one, or made here if that is -1;
// `started` is called when requests are accepted. Helping processes write to `output`.
template <typename Started>
void Serve(const Options& options, int activated, int output, Started started) {
  const int signals = CatchSignals();
  umask(S_IRWXG | S_IRWXO);
  RaiseDescriptorLimit();
  MakeDirectories(kSocketDirectory, S_IRWXU | S_IRGRP | S_IXGRP | S_IROTH | S_IXOTH);
  MakeDirectories(kStateDirectory, S_IRWXU);
  const ProcessLock lock(kLockFile);
  CheckProcess checks(output);
  Catalog catalog(kRegistryFile, checks);
  Dispatcher dispatcher(catalog);
  std::optional<SocketFile> socket_file;
  if (activated < 0) socket_file.emplace(kSocketPath);
  const int listener = activated < 0 ? socket_file->Release() : activated;
  Server server(dispatcher, listener, signals, options.time_limit);
  syslog(LOG_NOTICE, "started, %zu indexes", catalog.All().size());
  started();
  NotifyReady();
  server.Run(kWorkers);
  catalog.Save();
  syslog(LOG_NOTICE, "stopped");
}

void Start(const Options& options) {
  LoadFolding();
  ShareHeaps();
  const int activated = TakeActivatedSocket();
  const int background_fd = options.foreground ? -1 : GoToBackground();
  const host::sdk::UniqueFd null(open("/dev/null", O_RDWR | O_CLOEXEC));
  if (!options.root.empty()) host::EnterDeviceRoot(options.root);
  OpenSystemLog(options.foreground);
  const int output = options.foreground ? STDERR_FILENO : null.Get();
  Serve(options, activated, output, [&] {
    if (options.ready_fd >= 0) ReportReady(options.ready_fd);
    if (options.foreground) return;
    DropTerminal(null.Get());
    ReportReady(background_fd);
  });
}

int Main(int argc, char** argv) {
  try {
    const Options options = ParseOptions(argc, argv);
    if (options.show_help) {
      std::fputs(HelpText(), stdout);
    } else if (options.show_version) {
      std::printf("%s %s\n", kName, TOVOELASTICD_VERSION);
    } else {
      Start(options);
    }
    return 0;
  } catch (const UsageError& e) {
    std::fprintf(stderr, "%s: %s\nTry '%s --help'.\n", kName, e.what(), kName);
    return kWrongUsage;
  } catch (const AlreadyRunning& e) {
    std::fprintf(stderr, "%s: %s\n", kName, e.what());
    return kAlreadyRunning;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "%s: %s\n", kName, e.what());
    return kFailure;
  }
}

}  // namespace
}  // namespace searchd

int main(int argc, char** argv) { return searchd::Main(argc, argv); }
