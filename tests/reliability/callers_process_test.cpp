// The library in processes of all kinds: other locales, closed standard streams, small stacks,
// after a fork, beside threads of the caller's own.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <json/writer.h>  // prints values in failure messages
#include <pthread.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <thread>
#include <vector>

#include "appindex/elastic_control.h"
#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "appindex/string_pool.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/reliability/callers_process.h"

namespace {

using test::AllCalls;
using test::CallersProcess;
using test::ExportedCall;
using test::StatusOf;
using velkor::appindex::LanguagePack;

TEST_F(CallersProcess, GetsFromEveryFunctionWhatItIsToGive) { EXPECT_EQ(Fault(AllCalls()), ""); }

TEST_F(CallersProcess, MayHaveClosedItsStandardStreams) {
  const auto usual = UsualIndexes();
  const int status = StatusOf([] {
    for (const int fd : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) close(fd);
    if (!Fault(AllCalls()).empty()) return 1;
    // The library's own descriptors may have had these numbers, and have given them back.
    for (const int fd : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
      if (fcntl(fd, F_GETFD) >= 0) return 2;
    }
    return 0;
  });
  EXPECT_EQ(status, 0);
  EXPECT_EQ(model_.Committed(), usual);
}

TEST_F(CallersProcess, MayForkBetweenCalls) {
  const auto usual = UsualIndexes();
  EXPECT_EQ(StatusOf([] { return Fault(AllCalls()).empty() ? 0 : 1; }), 0);
  EXPECT_EQ(model_.Committed(), usual);
  EXPECT_EQ(Fault(AllCalls()), "");
  EXPECT_EQ(model_.Committed(), usual);
}

class CallerWithDeadDaemon : public test::DeviceRootTest {};

TEST_F(CallerWithDeadDaemon, IsNotEndedBySigpipe) {
  test::ScriptedDaemon daemon({{test::Reaction::kRejectSend, ""}});
  // Larger than a socket takes at once.
  test::WriteFile(test::ConfOf("App"),
                  R"({"app":"App","title":")" + std::string(4 << 20, 't') + "\"}");
  const int status = StatusOf([] {
    std::signal(SIGPIPE, SIG_DFL);
    try {
      velkor::appindex::Add(test::ConfOf("App"), true);
    } catch (const velkor::Error& error) {
      return error.code == velkor::Error::kElasticdRequestError ? 0 : 1;
    }
    return 2;
  });
  EXPECT_EQ(status, 0);
}

#ifdef WITHOUT_SANITIZER  // which makes stack frames larger

// Runs `work` on a thread with so large a stack.
void RunOnStack(std::size_t bytes, const std::function<void()>& work) {
  pthread_attr_t attributes;
  pthread_attr_init(&attributes);
  ASSERT_EQ(pthread_attr_setstacksize(&attributes, bytes), 0);
  pthread_t thread{};
  const auto run = [](void* function) -> void* {
    (*static_cast<const std::function<void()>*>(function))();
    return nullptr;
  };
  auto copy = work;
  ASSERT_EQ(pthread_create(&thread, &attributes, run, &copy), 0);
  pthread_join(thread, nullptr);
  pthread_attr_destroy(&attributes);
}

constexpr std::size_t kSmallStack = std::size_t{128} * 1024;

TEST_F(CallersProcess, MayCallEverythingFromASmallStack) {
  RunOnStack(kSmallStack, [] { EXPECT_EQ(Fault(AllCalls()), ""); });
}

TEST_F(CallersProcess, MayReadAndWriteTheDeepestJsonFromASmallStack) {
  constexpr int kDeepest = 127;
  const std::string arrays = std::string(kDeepest, '[') + "1" + std::string(kDeepest, ']');
  std::string objects = "1";
  for (int level = 0; level < kDeepest; ++level) objects = "{\"a\":" + objects + "}";
  RunOnStack(kSmallStack, [&] {
    for (const std::string& text : {arrays, objects}) {
      Json::Value value;
      EXPECT_TRUE(velkor::fromString(value, text));
      EXPECT_EQ(velkor::toString(value), text);
      EXPECT_FALSE(velkor::fromString(value, "[" + text + "]"));
    }
  });
}

#endif

// The calls that work on what only their caller sees.
std::vector<ExportedCall> IndependentCalls() {
  std::vector<ExportedCall> chosen;
  for (const ExportedCall& call : AllCalls()) {
    for (const char* name : {"velkor::Error::Error", "velkor::isJsonType<string>",
                             "velkor::GetJsonValue<string>", "velkor::fromString", "velkor::toFile",
                             "velkor::IsFileExist", "velkor::appindex::GetSupportedLangs"}) {
      if (call.names[0] == name) chosen.push_back(call);
    }
  }
  return chosen;
}

TEST_F(CallersProcess, MayHaveThreadsThatCallAtTheSameTime) {
  constexpr int kThreads = 8;
  constexpr int kRounds = 20;
  constexpr char kTextsRoot[] = "/var/packages/App/target/ui/texts/";
  const std::vector<ExportedCall> calls = IndependentCalls();
  ASSERT_EQ(calls.size(), 7U);
  EXPECT_EQ(Fault(AllCalls()), "");  // the device's identity is asked for by one thread first
  const LanguagePack pack(kTextsRoot);
  std::vector<std::string> faults(kThreads);
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&, i] {
      std::string& fault = faults[static_cast<std::size_t>(i)];
      for (int round = 0; round < kRounds && fault.empty(); ++round) {
        fault = Fault(calls);
        velkor::appindex::elastic::IndexCommit("enu");
        const LanguagePack own(kTextsRoot);
        for (const LanguagePack* texts : {&pack, &own}) {
          if (texts->GetString("ger", "app", "title") != "Der Titel der Anwendung") fault = "texts";
        }
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(faults, std::vector<std::string>(kThreads));
}

}  // namespace
