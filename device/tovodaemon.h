// Contract: the device's Unix-socket client for its own daemons.
//
// A port provides these classes. One object is one connection; it is used by one thread at a time,
// different objects are independent. No call may raise SIGPIPE in the calling process, and every
// descriptor is close-on-exec.
#pragma once

#include <string>

namespace tovodaemon {

// A connected stream socket that carries whole text messages. How a message is delimited on the
// wire is the port's own choice and must match the daemon's side.
class SockConnection {
 public:
  SockConnection();
  // Closes the descriptor if one is open.
  virtual ~SockConnection();
  SockConnection(const SockConnection&) = delete;
  SockConnection& operator=(const SockConnection&) = delete;

  // Closes the descriptor if it is not -1 and sets it to -1. May be called again.
  virtual void Disconnect();

  // Sends the whole text as one message. Blocks until the kernel has taken all of it. Returns false
  // when not connected, when the peer is gone or when the message is too long for the port's
  // framing; errno then tells why.
  bool Send(const std::string& message);

  // Receives one whole message into `message`, replacing its content. Blocks until it is complete.
  // Returns false, with `message` empty, when not connected, when the peer closes before a message
  // is complete or when the message is longer than the port allows; errno then tells why, and is 0
  // when the peer closed in good order.
  bool Recv(std::string& message);

 protected:
  int fd_;  // -1 whenever not connected

 private:
  std::string ahead_;  // for a port that receives more than one message at once: what is left
};

// A SockConnection to a daemon that listens on a socket file.
class DomainSockConnection : public SockConnection {
 public:
  // Keeps the path; does not connect.
  explicit DomainSockConnection(const std::string& path);

  // Opens a stream socket and connects it to the path. Waits at most `timeout_seconds` seconds for
  // the daemon to take the connection. Returns false on failure, with the object disconnected;
  // errno then tells why. An object that is connected already is disconnected first.
  bool Connect(long timeout_seconds);

 private:
  std::string path_;
};

}  // namespace tovodaemon
