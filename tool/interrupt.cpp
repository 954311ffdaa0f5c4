#include "tool/interrupt.h"

#include <unistd.h>

#include <csignal>
#include <cstring>
#include <initializer_list>

namespace tool {
namespace {

// Read by the handler, so written before it is there.
const char* volatile message = "";
volatile std::sig_atomic_t line_open = 0;

// There is nobody to tell when it fails.
void Write(const char* text) {
  if (write(STDERR_FILENO, text, std::strlen(text)) < 0) return;
}

// Calls only what a signal handler may. The signal's default is back already; raised again here, it
// takes effect on return.
void Handle(int signal) {
  if (line_open != 0) Write("\n");
  Write("appindex: interrupted; ");
  Write(message);
  Write("\n");
  raise(signal);
}

}  // namespace

void SayWhenInterrupted(const char* line) {
  message = line;
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    struct sigaction action {};
    sigaction(signal, nullptr, &action);
    if (action.sa_handler == SIG_IGN) continue;  // as nohup sets it
    action = {};
    action.sa_handler = Handle;
    action.sa_flags = static_cast<int>(SA_RESETHAND);
    sigfillset(&action.sa_mask);  // one message is enough
    sigaction(signal, &action, nullptr);
  }
}

void SetLineOpen(bool open) { line_open = open ? 1 : 0; }

}  // namespace tool
