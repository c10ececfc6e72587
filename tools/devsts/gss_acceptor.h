// SPDX-License-Identifier: Apache-2.0
/// @file
/// The service's side of a SPNEGO negotiation, through the system's GSSAPI.

#pragma once

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace DevSts {

/// The result of accepting a leg of the client.
struct AcceptedLeg {
  std::vector<unsigned char> answer;
  std::optional<std::string> client; ///< such as "alice@CORP.EXAMPLE", once the negotiation is complete
};

/// The service's side of one negotiation. For one thread at a time.
class Acceptance {
public:
  Acceptance() = default;
  Acceptance(const Acceptance &) = delete;
  Acceptance &operator=(const Acceptance &) = delete;
  virtual ~Acceptance() = default;

  /// @throws Refusal (wst:FailedAuthentication) with the GSSAPI's texts
  virtual AcceptedLeg Accept(const std::vector<unsigned char> &leg) = 0;
};

/// Begins negotiations. Any number of threads may use it at once.
class GssAcceptor {
public:
  GssAcceptor() = default;
  GssAcceptor(const GssAcceptor &) = delete;
  GssAcceptor &operator=(const GssAcceptor &) = delete;
  virtual ~GssAcceptor() = default;

  virtual std::unique_ptr<Acceptance> Begin() const = 0;
};

/// Accepts tickets for every service whose key is in the keytab. `replays` is a file in which the GSSAPI records the
/// tickets that it has seen.
/// @throws std::runtime_error when the keytab cannot be used, or when this program was built without the GSSAPI
std::unique_ptr<const GssAcceptor> CreateGssAcceptor(const std::filesystem::path &keytab,
                                                     const std::filesystem::path &replays);

} // namespace DevSts
