// The device's Unix-socket client in a test's hands: a program that links fake_connection.cpp has
// connections that go nowhere and do what the test says.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace test {

struct FakeConnections {
  // What every connection does.
  bool connects = true;
  bool sends = true;
  bool receives = true;
  std::string reply = R"({"success":true})";  // what Recv gives, also when it fails
  std::function<void()> on_send;              // called first thing in Send

  // What was seen.
  std::vector<std::string> paths;  // of each object made
  std::vector<long> timeouts;      // of each Connect
  std::vector<std::string> sent;   // by each Send
  int connected = 0;               // how many connections are open now
  bool recv_into_empty = true;     // whether every Recv got an empty string
};

FakeConnections& Connections();

}  // namespace test
