// SPDX-License-Identifier: Apache-2.0
// Each message under tests/data/messages/attacks has the outcome in expected.tsv, and its report agrees.

#include "judged_message.h"
#include "message_files.h"

#include "support/data_file.h"
#include "support/fixed_environment.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <set>
#include <string>

namespace Messages {
namespace {

class MessageFiles : public testing::Test {
private:
  const Testing::FixedEnvironment m_clock;
};

TEST_F(MessageFiles, HaveTheExpectedOutcome) {
  for (const MessageFile &file : AllMessageFiles()) {
    const Decision decision = Judge(MakeReceiver(file.options), file.xml);
    if (decision.message) {
      EXPECT_EQ(file.exceptionClass, "accepted") << file.name;
      EXPECT_EQ(file.text, GetProofName(decision.message->proof)) << file.name;
    } else {
      EXPECT_EQ(file.exceptionClass, decision.exceptionClass) << file.name;
      EXPECT_EQ(file.text, decision.refusal) << file.name;
    }
    EXPECT_EQ("", decision.contradictions) << file.name;
  }
}

TEST_F(MessageFiles, AreAllInTheTable) {
  std::set<std::string> listed;
  for (const MessageFile &file : AllMessageFiles()) {
    EXPECT_TRUE(listed.insert(file.name + ".xml").second) << file.name;
  }
  std::set<std::string> present;
  for (const auto &entry : std::filesystem::directory_iterator(Testing::DataPath("messages/attacks"))) {
    if (entry.path().extension() == ".xml") {
      present.insert(entry.path().filename());
    }
  }
  EXPECT_EQ(present, listed);
}

TEST_F(MessageFiles, ListTheCoveredElementsInDocumentOrder) {
  for (const MessageFile &file : AllMessageFiles()) {
    if (!file.IsAccepted() || file.text != "message-signature") {
      continue;
    }
    const Decision decision = Judge(MakeReceiver(file.options), file.xml);
    ASSERT_TRUE(decision.message) << file.name;
    const SsoClient::VerifiedMessage &message = *decision.message;
    EXPECT_TRUE(message.IsCovered(*message.body)) << file.name;
    for (std::size_t index = 1; index < message.covered.size(); ++index) {
      const auto &before = *message.covered[index - 1].element;
      const auto &after = *message.covered[index].element;
      EXPECT_TRUE(before.GetLine() < after.GetLine() ||
                  (before.GetLine() == after.GetLine() && before.GetColumn() < after.GetColumn()))
          << file.name;
    }
  }
}

} // namespace
} // namespace Messages
