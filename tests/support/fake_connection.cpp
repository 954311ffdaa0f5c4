#include "tests/support/fake_connection.h"

#include "device/tovodaemon.h"

namespace test {

FakeConnections& Connections() {
  static FakeConnections connections;
  return connections;
}

}  // namespace test

namespace {

constexpr int kOpen = 0;  // stands for a descriptor; never used as one

}  // namespace

namespace tovodaemon {

SockConnection::SockConnection() : fd_(-1) {}

SockConnection::~SockConnection() { SockConnection::Disconnect(); }

void SockConnection::Disconnect() {
  if (fd_ == kOpen) --test::Connections().connected;
  fd_ = -1;
}

bool SockConnection::Send(const std::string& message) {
  test::Connections().sent.push_back(message);
  if (test::Connections().on_send) test::Connections().on_send();
  return test::Connections().sends;
}

bool SockConnection::Recv(std::string& message) {
  if (!message.empty()) test::Connections().recv_into_empty = false;
  message = test::Connections().reply;
  return test::Connections().receives;
}

DomainSockConnection::DomainSockConnection(const std::string& path) : path_(path) {
  test::Connections().paths.push_back(path_);
}

bool DomainSockConnection::Connect(long timeout_seconds) {
  test::Connections().timeouts.push_back(timeout_seconds);
  if (!test::Connections().connects) return false;
  fd_ = kOpen;
  ++test::Connections().connected;
  return true;
}

}  // namespace tovodaemon
