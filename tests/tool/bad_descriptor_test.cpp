// One descriptor that fails, among others, in a rebuild: what it does to the others, who names it,
// and that everything is found again when it is mended.
#include <gmock/gmock.h>

#include "appindex/index_mgr.h"
#include "tests/integration/real_device.h"
#include "tests/tool/tool_process.h"

namespace test {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::StartsWith;
using velkor::appindex::ProcessQueue;

constexpr char kRebuild[] = R"({"op":3})";

// Its path comes behind those of the modules and of Backup, and before that of Photos.
class BadDescriptor : public RealDeviceTest {
 protected:
  BadDescriptor() {
    Enqueue(kRebuild);
    ProcessQueue();
    WriteFile(ConfOf("Broken"), R"({"app":[]})");
  }

  Finished Run(const std::vector<std::string>& arguments) const {
    return RunTool({OutsideRootFd(), OutsidePath()}, arguments);
  }
  Json::Value Culprit() const { return Parse(Run({"--json", "status"}).out)["held_up_by"]; }

  static void FailToRebuild() {
    Enqueue(kRebuild);
    EXPECT_EQ(ThrownBy(ProcessQueue).code, velkor::Error::kJsonError);
  }
};

TEST_F(BadDescriptor, IsFoundBeforeTheRebuild) {
  const Finished lint = Run({"lint", "/"});
  EXPECT_EQ(lint.status, 5);
  EXPECT_THAT(lint.out, HasSubstr(ConfOf("Broken") + ":"));
  Enqueue(kRebuild);
  EXPECT_EQ(Culprit()["from"].asString(), "queue");
  EXPECT_THAT(Culprit()["problem"].asString(), StartsWith(ConfOf("Broken") + ": "));
}

TEST_F(BadDescriptor, LeavesNothingToBeFoundAfterARebuild) {
  ASSERT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
  FailToRebuild();
  EXPECT_EQ(Everything(), Exactly({}));
  velkor::appindex::Add(kFilesConf, true);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash"}))
      << "what comes before it was written, and not committed";
}

TEST_F(BadDescriptor, KeepsTheBatchAndIsNamed) {
  FailToRebuild();
  EXPECT_EQ(ReadFile(kBatch), std::string(kRebuild) + "\n");
  EXPECT_EQ(ThrownBy(ProcessQueue).code, velkor::Error::kJsonError) << "again and again";
  EXPECT_TRUE(Exists(kBatch));
  const Json::Value culprit = Culprit();
  EXPECT_EQ(culprit["from"].asString(), "batch");
  EXPECT_EQ(culprit["op"].asString(), "reindex");
  EXPECT_THAT(culprit["problem"].asString(), StartsWith(ConfOf("Broken") + ": "));
  EXPECT_EQ(culprit["code"].asInt(), velkor::Error::kJsonError);
  const Finished finished = Run({"process-queue"});
  EXPECT_EQ(finished.status, 1);
  EXPECT_THAT(finished.err, StartsWith("appindex: " + ConfOf("Broken") + ": "));
}

TEST_F(BadDescriptor, LetsEverythingBeFoundWhenItIsMended) {
  FailToRebuild();
  Enqueue(Request(2, ConfOf("Photos")));
  WriteFile(ConfOf("Broken"), R"({"app":"Broken","title":"t","keywords":["everything"]})");
  ProcessQueue();
  EXPECT_FALSE(Exists(kBatch));
  EXPECT_EQ(Everything(), Exactly({"Backup", "Broken", "Files", "Files?tab=trash"}))
      << "the rebuild, and what was queued behind it";
}

}  // namespace
}  // namespace test
