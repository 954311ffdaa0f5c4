// Files and clients of the daemon where a call is interrupted or fails half-way.
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <string>

#include "host/framing.h"
#include "host/searchd/connection.h"
#include "host/searchd/durable_file.h"
#include "host/searchd/registry.h"
#include "host/searchd/request_error.h"
#include "tests/unit/host/temp_dir.h"
#include "tests/unit/searchd/failing_calls.h"

namespace searchd {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

class ReplaceFileTest : public ::testing::Test {
 protected:
  ReplaceFileTest() { dir_.Write("it", "old"); }
  ~ReplaceFileTest() override { failing_call = {}; }

  const TempDir dir_;
  const std::string file_ = dir_ / "it";
};

TEST_F(ReplaceFileTest, AnInterruptedWriteGoesOn) {
  failing_call = {"write", EINTR, 0};
  ReplaceFile(file_, "new");
  EXPECT_EQ(failing_call.name, "");
  EXPECT_EQ(ReadFile(file_), "new");
}

TEST_F(ReplaceFileTest, AFailureKeepsTheOldFileAndLeavesNothingBehind) {
  for (const char* call : {"write", "rename"}) {
    failing_call = {call, ENOSPC, 0};
    try {
      ReplaceFile(file_, "new");
      ADD_FAILURE() << call;
    } catch (const RequestError& e) {
      EXPECT_EQ(e.GetCode(), Code::kStorage);
    }
    EXPECT_EQ(ReadFile(file_), "old");
    EXPECT_THAT(dir_.Names(), ElementsAre("it"));
  }
}

TEST_F(ReplaceFileTest, AFileWhoseNameMayBeLostIsAFailure) {
  // The directory cannot be opened, or not be synced as the file was.
  for (const FailingCall& call : {FailingCall{"open", EMFILE, 1}, FailingCall{"fsync", EIO, 1}}) {
    failing_call = call;
    EXPECT_THROW(ReplaceFile(file_, "new"), RequestError) << call.name;
    EXPECT_THAT(dir_.Names(), ElementsAre("it"));
  }
}

TEST_F(ReplaceFileTest, AFileMayBeNamedFromWhereTheProcessIs) {
  ASSERT_EQ(chdir(dir_.Path().c_str()), 0);
  ReplaceFile("it", "new");
  EXPECT_EQ(ReadFile(file_), "new");
  ASSERT_EQ(chdir("/"), 0);
}

class RegistryRefusalTest : public ::testing::Test {
 protected:
  RegistryRefusalTest() { Registry(file_).Save({kEntry}); }
  ~RegistryRefusalTest() override { failing_call = {}; }

  // Loads the registry, and expects a failure of storage.
  std::string FailureOfLoading() const {
    std::string damage;
    try {
      Registry(file_).Load(damage);
    } catch (const RequestError& e) {
      EXPECT_EQ(e.GetCode(), Code::kStorage);
      return e.what();
    }
    ADD_FAILURE() << "nothing failed";
    return "";
  }

  const std::string kEntry =
      R"({"id":"a","path":"/var/packages/a","mappings":{"property_id":"id"}})";
  const TempDir dir_;
  const std::string file_ = dir_ / "indexes.json";
};

TEST_F(RegistryRefusalTest, OneThatCannotBeReadForNowIsNoDamagedOne) {
  const std::string content = ReadFile(file_);
  for (const int error : {EIO, EMFILE, ENFILE, ENOMEM, EINTR, EACCES}) {
    failing_call = {"open", error, 0};
    EXPECT_THAT(FailureOfLoading(), HasSubstr(std::strerror(error)));
    EXPECT_THAT(dir_.Names(), ElementsAre("indexes.json"));
    EXPECT_EQ(ReadFile(file_), content);
  }
  std::string damage;
  EXPECT_EQ(Registry(file_).Load(damage).size(), 1U);
}

TEST_F(RegistryRefusalTest, ADamagedOneThatCannotBeSetAsideStays) {
  dir_.Write("indexes.json", "{");
  failing_call = {"rename", EROFS, 0};
  EXPECT_THAT(FailureOfLoading(),
              AllOf(HasSubstr("cannot set aside " + file_), HasSubstr(std::strerror(EROFS))));
  EXPECT_EQ(ReadFile(file_), "{");
}

class ConnectionTest : public ::testing::Test {
 protected:
  ConnectionTest() {
    std::array<int, 2> ends{};
    EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK, 0, ends.data()), 0);
    client_ = ends[0];
    daemon_ = ends[1];
  }
  ~ConnectionTest() override {
    failing_call = {};
    close(client_);
  }

  int client_ = -1;
  int daemon_ = -1;  // the connection's
  const Connection::TimePoint never_ = Connection::TimePoint::max();
};

TEST_F(ConnectionTest, InterruptedCallsGoOn) {
  Connection connection(daemon_, never_);
  ASSERT_TRUE(host::SendFrame(client_, "request"));
  failing_call = {"recv", EINTR, 0};
  connection.Continue();
  ASSERT_EQ(connection.GetState(), Connection::State::kReceived);
  EXPECT_EQ(connection.TakeRequest(), "request");
  failing_call = {"send", EINTR, 0};
  connection.Reply("reply", never_);
  EXPECT_EQ(connection.GetState(), Connection::State::kDone);
  std::string reply;
  EXPECT_TRUE(host::RecvFrame(client_, reply));
  EXPECT_EQ(reply, "reply");
}

TEST_F(ConnectionTest, AClientThatIsGoneIsDoneWith) {
  Connection connection(daemon_, never_);
  failing_call = {"recv", ECONNRESET, 0};
  connection.Continue();
  EXPECT_EQ(connection.GetState(), Connection::State::kDone);
}

TEST_F(ConnectionTest, AClientIsWhoItsSystemSaysOrElseNobody) {
  EXPECT_EQ(Connection(dup(daemon_), never_).Client(), geteuid());
  failing_call = {"getsockopt", ENOBUFS, 0};
  EXPECT_EQ(Connection(daemon_, never_).Client(), 65534U) << "never root";
}

TEST_F(ConnectionTest, AReplyThatNobodyTakesWaits) {
  Connection connection(daemon_, never_);
  const std::string long_reply(std::size_t{4} * 1024 * 1024, 'x');
  connection.Reply(long_reply, never_);
  EXPECT_EQ(connection.GetState(), Connection::State::kSending);
  connection.Continue();
  EXPECT_EQ(connection.GetState(), Connection::State::kSending);
  failing_call = {"send", EPIPE, 0};
  connection.Continue();
  EXPECT_EQ(connection.GetState(), Connection::State::kDone);
}

}  // namespace
}  // namespace searchd
