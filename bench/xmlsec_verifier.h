// SPDX-License-Identifier: Apache-2.0
/// @file
/// The xmlsec1 library, the peer with which token verification is compared.

#pragma once

#include <memory>
#include <string>

namespace Bench {

/// Verifies signed documents with xmlsec1 and a key that is loaded once.
class XmlsecVerifier {
public:
  /// @param certificatePath a PEM certificate, whose key verifies.
  explicit XmlsecVerifier(const std::string &certificatePath);
  XmlsecVerifier(const XmlsecVerifier &) = delete;
  XmlsecVerifier &operator=(const XmlsecVerifier &) = delete;
  ~XmlsecVerifier();

  /// Parses `xml`, finds the signature of its root element and checks it with all its references.
  bool Verify(const std::string &xml) const;

private:
  struct State;
  std::unique_ptr<State> m_state;
};

} // namespace Bench
