// SPDX-License-Identifier: Apache-2.0

#include "proof/message_sinks.h"

#include <ssoclient/proof/exceptions.h>

namespace SsoClient {

namespace {

template <typename Exception>
class Thrower final : public DeviationSink {
public:
  bool IsFull() const noexcept override { return false; }
  void Add(Deviation deviation) override { throw Exception(deviation.message); }
  void Count() noexcept override {}
};

} // namespace

const MessageSinks &ThrowingMessageSinks() noexcept {
  static Thrower<InvalidMessageException> form;
  static Thrower<InvalidProofException> proof;
  static Thrower<StaleMessageException> time;
  static const MessageSinks sinks{form, proof, time};
  return sinks;
}

} // namespace SsoClient
