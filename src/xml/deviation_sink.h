// SPDX-License-Identifier: Apache-2.0
/// @file
/// `DeviationSink`, which receives everything for which the rules of the accepted form refuse an assertion.
///
/// Verification and reports run the same rules with different sinks: the sink of a verification throws at the first
/// deviation; that of a report keeps the deviation, and the rule goes on.

#pragma once

#include <tarvel/xml/node.h>

#include <cstdint>
#include <string>

namespace SsoClient {

/// One thing that the accepted form does not allow.
struct Deviation {
  std::string message;                               ///< the text of the `ParseException`
  const Tarvel::Xml::ElementNode *element = nullptr; ///< where it is; null if there is no element
  std::string attribute;                             ///< the name of an attribute; empty if it is about the element
  std::string allowed;                               ///< what the form allows or expects there; may be empty
  std::string found;                                 ///< what is there; may be empty
  std::int64_t missedBySec = 0; ///< of a time: by how many seconds this machine's clock misses it, after the tolerance
};

/// Receives deviations in the order in which the rules meet them. For one thread.
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

/// Reports the deviation that `make` returns. `make` is called only if `sink` keeps the deviation, so that a document with a
/// million deviations costs no texts.
template <typename Make>
void ReportDeviation(DeviationSink &sink, const Make &make) {
  if (sink.IsFull()) {
    sink.Count();
  } else {
    sink.Add(make());
  }
}

} // namespace SsoClient
