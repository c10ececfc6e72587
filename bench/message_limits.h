// SPDX-License-Identifier: Apache-2.0
/// @file
/// The cryptography that signing and verifying a message cannot avoid.

#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace Bench {

/// One RSA-2048 key, with all possible preparations made.
class RsaLimit {
public:
  /// @throws std::runtime_error
  explicit RsaLimit(const std::string &keyFile);
  RsaLimit(const RsaLimit &) = delete;
  RsaLimit &operator=(const RsaLimit &) = delete;
  ~RsaLimit();

  /// Makes a signature over a digest that exists already. @throws std::runtime_error
  void Sign();
  /// Checks a signature over such a digest. @throws std::runtime_error
  void Check();
  /// One SHA-256 of so many octets.
  void Hash(std::size_t octets);

private:
  struct State;
  const std::unique_ptr<State> m_state;
};

/// The length of each text that a verification of the message must hash: the elements that its signatures refer to, and each
/// `SignedInfo`. Canonical forms are a little longer, because they have declarations that the message has further outside.
/// @throws std::runtime_error when a reference refers to nothing
std::vector<std::size_t> ListSignedLengths(const std::string &message);

} // namespace Bench
