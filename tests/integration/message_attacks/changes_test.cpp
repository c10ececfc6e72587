// SPDX-License-Identifier: Apache-2.0
// Changed messages are accepted only if the elements that the caller receives as covered are those that were signed, and the
// report on each of them agrees with the verification.

#include "judged_message.h"
#include "message_changes.h"
#include "message_files.h"
#include "signed_elements.h"

#include "support/fixed_environment.h"
#include "support/repetitions.h"
#include "support/sanitized.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

namespace Messages {
namespace {

using Testing::RandomSource;

/// The genuine messages whose signature covers elements that do not contain the signature.
std::vector<MessageFile> SignedMessages() {
  std::vector<MessageFile> messages;
  for (const MessageFile &file : AllMessageFiles()) {
    const bool containsSignature = file.name == "genuine-envelope-covered" || file.name == "genuine-document-covered";
    if (file.IsAccepted() && file.text == "message-signature" && !containsSignature) {
      messages.push_back(file);
    }
  }
  return messages;
}

const MessageFile &FileOf(const std::string &name) {
  for (const MessageFile &file : AllMessageFiles()) {
    if (file.name == name) {
      return file;
    }
  }
  throw std::logic_error("no file " + name);
}

class ChangedMessages : public testing::Test {
protected:
  /// Checks one changed message. Explaining takes longer than verifying, so not each message is explained.
  void Check(const Receiver &receiver, const std::string &xml, bool isExplained) {
    Decision decision;
    if (isExplained) {
      decision = Judge(receiver, xml);
      ASSERT_EQ("", decision.contradictions) << xml;
    } else {
      decision = Verify(receiver, xml);
    }
    ASSERT_NE("undocumented", decision.exceptionClass) << decision.refusal << "\n" << xml;
    if (decision.message) {
      ++accepted;
      ASSERT_EQ("", m_signed.FindFault(xml, *decision.message)) << xml;
    } else {
      refusals.insert(decision.refusal);
    }
  }

  std::size_t accepted = 0;
  std::set<std::string> refusals;

private:
  const Testing::FixedEnvironment m_clock;
  const SignedElements m_signed;
};

/// 102,000 in full: more than 5,000 of each of 20 genuine messages.
TEST_F(ChangedMessages, AreAcceptedOnlyIfTheCoveredElementsAreTheSignedOnes) {
  const std::vector<MessageFile> messages = SignedMessages();
  const std::vector<MessageFile> &all = AllMessageFiles();
  const std::size_t each = Testing::IS_SANITIZED ? 10 : Testing::Repetitions<std::size_t>(5'100, 100);
  ASSERT_GE(messages.size(), 20u);
  RandomSource random(17);
  for (const MessageFile &file : messages) {
    const Receiver receiver = MakeReceiver(file.options);
    for (std::size_t change = 0; change < each; ++change) {
      const std::string &other = all[random.Below(all.size())].xml;
      Check(receiver, ChangeMessage(file.xml, other, random), change % 10 == 0);
      if (HasFatalFailure()) {
        return;
      }
    }
  }
  EXPECT_GT(accepted, each);
  EXPECT_GT(refusals.size(), Testing::IS_SANITIZED ? 50u : 200u);
}

TEST_F(ChangedMessages, AreRefusedAtEachPrefix) {
  const MessageFile &file = FileOf("genuine-soap11");
  const Receiver receiver = MakeReceiver(file.options);
  const std::size_t step = Testing::IS_SANITIZED ? 50 : 1;
  for (std::size_t length = 0; length < file.xml.size(); length += step) {
    Check(receiver, file.xml.substr(0, length), length % 100 == 0);
    ASSERT_FALSE(HasFatalFailure());
  }
  EXPECT_EQ(0u, accepted);
}

TEST_F(ChangedMessages, AreAcceptedOnlyAsSignedIfEveryThirdOctetIsChanged) {
  const MessageFile &file = FileOf("genuine-soap11");
  const Receiver receiver = MakeReceiver(file.options);
  const std::size_t step = Testing::IS_SANITIZED ? 99 : 3;
  for (const char changed : {'\0', ' ', 'A', '"', '<', '\x80'}) {
    for (std::size_t at = 0; at < file.xml.size(); at += step) {
      std::string xml = file.xml;
      xml[at] = xml[at] == changed ? 'b' : changed;
      Check(receiver, xml, at % 33 == 0);
      ASSERT_FALSE(HasFatalFailure()) << at;
    }
  }
  EXPECT_GT(refusals.size(), Testing::IS_SANITIZED ? 20u : 50u);
}

} // namespace
} // namespace Messages
