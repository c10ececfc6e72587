// SPDX-License-Identifier: Apache-2.0
// Large hostile headers are refused and explained in linear time.

#include "judged_message.h"
#include "message_files.h"

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/repetitions.h"

#include <gtest/gtest.h>

#include <ctime>
#include <string>
#include <vector>

namespace Messages {
namespace {

constexpr std::size_t SIXTEEN_MEBIBYTES = 16u * 1024 * 1024;

/// Where content is inserted, and what is repeated there.
struct HostileContent {
  const char *before;
  const char *piece;
};

constexpr HostileContent CONTENTS[] = {
    {"<wsse:Security ", "<x/>"},
    {"</wsse:Security>", "<x/>"},
    {"</wsse:Security>", "<ds:Signature xmlns:ds='http://www.w3.org/2000/09/xmldsig#'><ds:KeyInfo/></ds:Signature>"},
    {"</wsse:Security>", "<wsse:Security/>"},
    {"</wsu:Timestamp>", "<wsu:Created/>"},
    {"</s:Header>", "<wsse:Security xmlns:wsse='urn:x'/>"},
    {"</s:Header>", "<x Id='body'/>"},
    {"</ds:KeyInfo></ds:Signature></wsse:Security>", "<ds:KeyName/>"},
    {"</s:Body>", "<x Id='y'/>"},
    {"</s:Envelope>", "<x/>"},
};

std::string Repeated(const HostileContent &content, std::size_t bytes) {
  std::string message;
  for (const MessageFile &file : AllMessageFiles()) {
    if (file.name == "genuine-soap11") {
      message = file.xml;
    }
  }
  std::string repeated;
  while (repeated.size() + message.size() + 200 < bytes) {
    repeated += content.piece;
    if (repeated.size() / std::string(content.piece).size() > 900'000) {
      break; // the reader has a limit for nodes
    }
  }
  return message.insert(message.find(content.before), repeated);
}

double SecondsOf(const Receiver &receiver, const std::string &message) {
  const std::clock_t begin = std::clock();
  EXPECT_EQ("", Judge(receiver, message).contradictions);
  return static_cast<double>(std::clock() - begin) / CLOCKS_PER_SEC;
}

TEST(HostileHeader, IsExplainedInLinearTime) {
  const Testing::FixedEnvironment clock;
  const Receiver receiver = MakeReceiver("");
  const std::size_t large = Testing::Repetitions(SIXTEEN_MEBIBYTES, SIXTEEN_MEBIBYTES / 16);
  for (const HostileContent &content : CONTENTS) {
    const double small = SecondsOf(receiver, Repeated(content, large / 8));
    const double whole = SecondsOf(receiver, Repeated(content, large));
    EXPECT_LT(whole, 8 * 3 * small + 0.5) << content.before << content.piece;
  }
}

/// A `ds:KeyInfo` with a key on P-384, which takes long to read.
std::string KeyInfoWithKey() {
  const std::string token = Testing::ReadDataFile("saml2/holder-ec384-value.xml");
  const std::string end = "</ds:KeyValue>";
  const std::size_t begin = token.find("<ds:KeyValue");
  return "<ds:KeyInfo>" + token.substr(begin, token.find(end, begin) + end.size() - begin) + "</ds:KeyInfo>";
}

TEST(HostileSignature, HasAtMostOneKeyRead) {
  const Testing::FixedEnvironment clock;
  const Receiver receiver = MakeReceiver("");
  const char *const before = "</ds:Signature></wsse:Security>";
  const std::string withKey = KeyInfoWithKey();
  const std::string withName =
      "<ds:KeyInfo><ds:KeyName>" + std::string(withKey.size(), 'x') + "</ds:KeyName></ds:KeyInfo>";
  const double names = SecondsOf(receiver, Repeated({before, withName.c_str()}, SIXTEEN_MEBIBYTES / 8));
  const double keys = SecondsOf(receiver, Repeated({before, withKey.c_str()}, SIXTEEN_MEBIBYTES / 8));
  EXPECT_LT(keys, 10 * names + 0.1);
}

} // namespace
} // namespace Messages
