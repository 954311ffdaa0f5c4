// How one message travels on the search daemon's socket, in both directions: its length in bytes as
// four bytes, big-endian, then that many bytes of UTF-8 JSON text. Client and daemon share this.
#pragma once

#include <cstddef>
#include <string>

namespace host {

// The longest message: larger than any search document, small enough to hold in memory many times.
constexpr std::size_t kMaxFrameBytes = std::size_t{16} * 1024 * 1024;

// How many bytes the length takes, and those bytes from and to the length.
constexpr std::size_t kFrameHeaderBytes = 4;
std::string FrameHeader(std::size_t length);
std::size_t FrameLength(const char* header);

// Sends one message on the blocking socket `fd`. False, with errno set, when the peer is gone
// (EPIPE, without the signal), the message is too long (EMSGSIZE) or the socket fails.
bool SendFrame(int fd, const std::string& message);

// Receives one message from the blocking socket `fd`, as a rule with one call. `ahead` holds what
// has arrived behind the message before it, and then what has arrived behind this one. False when
// the peer closes before the message is complete (errno 0 when it closed between messages, EPROTO
// when inside one), when the announced length is over the limit (EMSGSIZE) or when the socket
// fails; `message` is then empty.
bool RecvFrame(int fd, std::string& ahead, std::string& message);

// The same where nothing can be behind the message, as one who waits for an answer knows.
bool RecvFrame(int fd, std::string& message);

}  // namespace host
