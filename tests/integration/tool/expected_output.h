// SPDX-License-Identifier: Apache-2.0
/// @file
/// The expected output in tests/data/tool.

#pragma once

#include "process.h"
#include "token_values.h"

#include "support/data_file.h"

#include <nlohmann/json.hpp>

#include <string>
#include <utility>

namespace ToolTest {

/// The thumbprint of the fixtures' holder, which changes when the fixtures are made again.
inline std::string HolderSha256() {
  const Result result = RunShell(
      "openssl x509 -in holder.crt -noout -fingerprint -sha256 | sed 's/.*=//;s/://g' | tr -d '\\n' | tr A-F a-f");
  return result.out;
}

/// The public key of the fixtures' holder, which changes when the fixtures are made again.
inline std::string HolderKey() {
  return RunShell("openssl x509 -in holder.crt -noout -pubkey | openssl pkey -pubin -outform DER | base64 -w0").out;
}

/// The expected output in tests/data/tool, with the thumbprint and the key filled in.
inline std::string Expected(const std::string &file) {
  std::string text = Testing::ReadDataFile("tool/" + file);
  const std::string thumbprint = "@HOLDER_SHA256@";
  const std::string key = "@HOLDER_KEY@";
  if (text.find(thumbprint) != std::string::npos) {
    text = Fill(std::move(text), thumbprint, HolderSha256());
  }
  return text.find(key) == std::string::npos ? text : Fill(std::move(text), key, HolderKey());
}

inline std::string ExpectedJson(const std::string &file, bool verified) {
  return Fill(Expected(file), "@VERIFIED@", verified ? "true" : "false");
}

/// The JSON `text` without its key "report". @throws what nlohmann_json throws if `text` does not have that key.
inline std::string WithoutReport(const std::string &text) {
  auto json = nlohmann::ordered_json::parse(text);
  json.at("report");
  json.erase("report");
  return json.dump(2, ' ', true) + "\n";
}

/// The JSON `text` without the keys of a token's details. @throws what nlohmann_json throws if one of them is missing.
inline std::string WithoutDetails(const std::string &text) {
  auto json = nlohmann::ordered_json::parse(text);
  for (const char *const key : {"nameId", "issuer", "issueInstant", "confirmations", "audienceRestrictions",
                                "oneTimeUse", "proxyRestriction", "authnStatements", "attributes"}) {
    json.at(key);
    json.erase(key);
  }
  return json.dump(2, ' ', true) + "\n";
}

} // namespace ToolTest
