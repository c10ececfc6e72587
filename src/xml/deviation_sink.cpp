// SPDX-License-Identifier: Apache-2.0

#include "xml/deviation_sink.h"

#include <ssoclient/exceptions.h>

namespace SsoClient {

namespace {

class Thrower final : public DeviationSink {
public:
  bool IsFull() const noexcept override { return false; }
  void Add(Deviation deviation) override { throw ParseException(deviation.message); }
  void Count() noexcept override {}
};

} // namespace

DeviationSink &ThrowingSink() noexcept {
  static Thrower thrower;
  return thrower;
}

} // namespace SsoClient
