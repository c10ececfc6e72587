// SPDX-License-Identifier: Apache-2.0
/// @file
/// What was signed in the genuine messages, computed by libxml2.

#pragma once

#include <ssoclient/proof/message_verifier.h>

#include <set>
#include <string>

namespace Messages {

/// The canonical forms of the elements that senders have signed.
class SignedElements {
public:
  /// Those of all genuine messages. An element that contains the signature is signed without it.
  SignedElements();

  /// What is wrong with an accepted message: a covered element was never signed by a sender with this content, or the body
  /// that a reader finds is not among the covered elements. The elements are found again in the text `xml` by libxml2.
  /// Empty if nothing is wrong.
  std::string FindFault(const std::string &xml, const SsoClient::VerifiedMessage &message) const;

private:
  std::set<std::string> m_canonicalForms;
};

} // namespace Messages
