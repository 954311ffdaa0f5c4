#include "host/searchd/options.h"

#include <fcntl.h>
#include <getopt.h>

#include <array>
#include <charconv>
#include <string_view>

namespace searchd {
namespace {

int ParseNumber(const char* option, std::string_view text, int least, int most) {
  int number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error == std::errc() && end == text.data() + text.size() && number >= least &&
      number <= most) {
    return number;
  }
  throw UsageError(std::string(option) + " takes a number from " + std::to_string(least) + " to " +
                   std::to_string(most) + ", not \"" + std::string(text) + "\"");
}

int ParseDescriptor(std::string_view text) {
  const int fd = ParseNumber("--ready-fd", text, 0, 1 << 20);
  if (fcntl(fd, F_GETFD) < 0) throw UsageError("--ready-fd: no descriptor is open as that number");
  return fd;
}

}  // namespace

Options ParseOptions(int argc, char** argv) {
  static const std::array<option, 7> known = {{{"root", required_argument, nullptr, 'r'},
                                               {"foreground", no_argument, nullptr, 'f'},
                                               {"ready-fd", required_argument, nullptr, 'n'},
                                               {"time-limit", required_argument, nullptr, 't'},
                                               {"version", no_argument, nullptr, 'V'},
                                               {"help", no_argument, nullptr, 'h'},
                                               {nullptr, 0, nullptr, 0}}};
  Options options;
  opterr = 0;
  for (;;) {
    switch (getopt_long(argc, argv, ":fh", known.data(), nullptr)) {
      case -1:
        if (optind < argc) throw UsageError(std::string("unexpected argument: ") + argv[optind]);
        return options;
      case 'r':
        options.root = optarg;
        if (options.root.empty()) throw UsageError("--root takes a directory");
        break;
      case 'f':
        options.foreground = true;
        break;
      case 'n':
        options.ready_fd = ParseDescriptor(optarg);
        break;
      case 't':
        options.time_limit = std::chrono::seconds(ParseNumber("--time-limit", optarg, 1, 3600));
        break;
      case 'V':
        options.show_version = true;
        break;
      case 'h':
        options.show_help = true;
        break;
      case ':':
        throw UsageError(std::string(argv[optind - 1]) + " takes an argument");
      default:
        throw UsageError(std::string("unknown option: ") + argv[optind - 1]);
    }
  }
}

const char* HelpText() {
  return "Usage: tovoelasticd [OPTION]...\n"
         "Keeps search indexes and answers searches on /var/run/tovoelasticd.sock.\n"
         "\n"
         "  -f, --foreground     stay in the foreground and log to standard error as well\n"
         "      --root DIR       see DIR as the root directory\n"
         "      --ready-fd N     write a line to descriptor N and close it as soon as requests\n"
         "                       are accepted\n"
         "      --time-limit S   seconds that a client has to deliver its request, and again to\n"
         "                       take the reply (30)\n"
         "      --version        print the version\n"
         "  -h, --help           print this help\n"
         "\n"
         "Without --foreground the command returns when requests are accepted.\n"
         "Exit status: 0 done, 1 failure, 2 wrong usage, 3 another daemon serves this root.\n";
}

}  // namespace searchd
