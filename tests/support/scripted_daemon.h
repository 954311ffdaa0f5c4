// A search daemon that answers what a test tells it, well or badly.
#pragma once

#include <json/value.h>

#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace test {

// What the daemon does with one connection.
struct Reaction {
  enum Kind {
    kReply,       // reads the request, answers with `text` as one message
    kRawBytes,    // reads the request, sends `text` as it stands, without framing, and closes
    kOneByOne,    // the same, each byte when the one before has been taken
    kHangUp,      // reads the request and closes without an answer
    kRejectSend,  // closes without reading the request, so that sending a large one fails
    kReadPart,    // reads `bytes` bytes of the request's frame and closes
  };
  Kind kind = kReply;
  std::string text;
  std::size_t bytes = 0;
};

Reaction Success();
// {"success":false,"error":{"code":CODE,"msg":MSG}}
Reaction Failure(int code, const std::string& msg);
Reaction Reply(const std::string& text);

// Listens on "/var/run/tovoelasticd.sock" of the root that the process is in, from construction to
// destruction, and serves one connection at a time on a thread of its own.
class ScriptedDaemon {
 public:
  // `react` gets each request and runs on the daemon's thread. It cannot choose kRejectSend or
  // kReadPart, since the request has been read by then.
  using React = std::function<Reaction(const Json::Value& request)>;
  explicit ScriptedDaemon(React react);
  // Reacts with the elements in order, then with success.
  explicit ScriptedDaemon(std::vector<Reaction> script = {});
  ~ScriptedDaemon();
  ScriptedDaemon(const ScriptedDaemon&) = delete;
  ScriptedDaemon& operator=(const ScriptedDaemon&) = delete;

  // All requests read so far, in order. When a call of the library has returned, its requests are
  // in.
  std::vector<Json::Value> Requests();
  // From now on without those read so far.
  void ForgetRequests();
  // The same, each shortened to "command id" or "command id doc_id", such as
  // "document_upsert_by_id appindex_enu App".
  std::vector<std::string> Commands();
  // How many connections were accepted.
  int Connections();

 private:
  void Serve();
  void Handle(int fd);

  // Empty `react_`: reacts with `script_`.
  ScriptedDaemon(std::vector<Reaction> script, React react);

  std::vector<Reaction> script_;
  React react_;
  int listener_;
  std::mutex mutex_;
  std::vector<Json::Value> requests_;
  int connections_ = 0;
  std::thread thread_;
};

}  // namespace test
