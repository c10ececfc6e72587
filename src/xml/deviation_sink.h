// SPDX-License-Identifier: Apache-2.0
/// @file
/// `DeviationSink`, which receives each deviation of an assertion from the accepted form.
///
/// Verification and reports run the same rules with different sinks. The sink of a verification throws at the first
/// deviation. The sink of a report keeps the deviation, and the rule continues.

#pragma once

#include <tarvel/xml/node.h>

#include <cstdint>
#include <string>

namespace SsoClient {

/// One thing that the accepted form does not allow.
struct Deviation {
  std::string message;                               ///< the text of the `ParseException`
  const Tarvel::Xml::ElementNode *element = nullptr; ///< where it is; null if there is no element
  std::string attribute;                             ///< the attribute's name; empty if the element itself deviates
  std::string allowed;                               ///< what the form allows or expects there; may be empty
  std::string found;                                 ///< what is there; may be empty
  std::int64_t missedBySec = 0; ///< by how many seconds this machine's clock is beyond a limit and the tolerance
};

/// Receives deviations in the order in which the rules find them. Used by one thread, except for `ThrowingSink`.
class DeviationSink {
public:
  /// Whether deviations are only counted from now on, so that their texts need not be made.
  virtual bool IsFull() const noexcept = 0;

  /// Receives a deviation.
  /// @throws ParseException with the message, if this is the sink of a verification.
  virtual void Add(Deviation deviation) = 0;

  /// Counts a deviation. Called instead of `Add` if the sink is full.
  virtual void Count() noexcept = 0;

protected:
  DeviationSink() = default;
  DeviationSink(const DeviationSink &) = default;
  DeviationSink &operator=(const DeviationSink &) = default;
  ~DeviationSink() = default;
};

/// The sink of verifications, which throws at the first deviation. It has no state, so all threads may use it.
DeviationSink &ThrowingSink() noexcept;

/// Reports the deviation that `make` returns. `make` is called only if `sink` keeps the deviation, so a document with a
/// million deviations does not cost a million texts.
template <typename Make>
void ReportDeviation(DeviationSink &sink, const Make &make) {
  if (sink.IsFull()) {
    sink.Count();
  } else {
    sink.Add(make());
  }
}

} // namespace SsoClient
