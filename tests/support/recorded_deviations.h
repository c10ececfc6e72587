// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RecordedDeviations`, a sink that collects deviations, and the deviations of a rule as comparable texts.

#pragma once

#include "xml/deviation_sink.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <limits>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

namespace Testing {

/// Keeps the first deviations, and counts the others.
class RecordedDeviations final : public SsoClient::DeviationSink {
public:
  explicit RecordedDeviations(std::size_t capacity = std::numeric_limits<std::size_t>::max()) : m_capacity(capacity) {}

  bool IsFull() const noexcept override { return all.size() >= m_capacity; }
  void Add(SsoClient::Deviation deviation) override {
    EXPECT_FALSE(IsFull()) << "the text of a deviation was made for a full sink: " << deviation.message;
    all.push_back(std::move(deviation));
  }
  void Count() noexcept override {
    EXPECT_TRUE(IsFull());
    ++unlisted;
  }

  std::vector<SsoClient::Deviation> all;
  std::size_t unlisted = 0;

private:
  std::size_t m_capacity;
};

/// What a test expects of a deviation. `element` is the element's name as written.
struct ExpectedDeviation {
  std::string message;
  std::string element;
  std::string attribute;
  std::string allowed;
  std::string found;

  friend bool operator==(const ExpectedDeviation &, const ExpectedDeviation &) = default;
  friend std::ostream &operator<<(std::ostream &out, const ExpectedDeviation &deviation) {
    return out << "\n  {\"" << deviation.message << "\", \"" << deviation.element << "\", \"" << deviation.attribute
               << "\", \"" << deviation.allowed << "\", \"" << deviation.found << "\"}";
  }
};

inline ExpectedDeviation AsExpected(const SsoClient::Deviation &deviation) {
  return {deviation.message, deviation.element ? std::string(deviation.element->GetName()) : std::string(),
          deviation.attribute, deviation.allowed, deviation.found};
}

/// Calls `rule` with a sink that collects, like that of a report, and with a sink that throws, like that of a
/// verification. Expects that the exception has the text of the first deviation, or that there is neither. Returns the
/// deviations.
template <typename Rule>
std::vector<ExpectedDeviation> DeviationsOf(const Rule &rule) {
  RecordedDeviations recorded;
  rule(recorded);
  std::string refusal;
  try {
    rule(SsoClient::ThrowingSink());
  } catch (const SsoClient::ParseException &error) {
    refusal = error.what();
  }
  EXPECT_EQ(recorded.all.empty() ? std::string() : recorded.all.front().message, refusal);
  std::vector<ExpectedDeviation> deviations;
  for (const SsoClient::Deviation &deviation : recorded.all) {
    deviations.push_back(AsExpected(deviation));
  }
  return deviations;
}

/// Only the messages.
template <typename Rule>
std::vector<std::string> MessagesOf(const Rule &rule) {
  std::vector<std::string> messages;
  for (const ExpectedDeviation &deviation : DeviationsOf(rule)) {
    messages.push_back(deviation.message);
  }
  return messages;
}

} // namespace Testing
