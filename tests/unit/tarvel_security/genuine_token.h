// SPDX-License-Identifier: Apache-2.0
/// @file
/// A genuine token, and the result of verifying it after a change.

#pragma once

#include "documents.h"

#include <tarvel/xml/security/exceptions.h>

#include <string>
#include <string_view>

namespace Testing {

inline std::string GenuineToken() {
  return ReadDataFile("tokens/rsa-sha256.xml");
}

inline std::string IdOf(const std::string &token) {
  const std::size_t begin = token.find(" ID=\"") + 5;
  return token.substr(begin, token.find('"', begin) - begin);
}

/// The message with which `text` is refused; otherwise "accepted", or "wrong" for a wrong digest or signature value.
inline std::string RefusalOf(const std::string &text) {
  try {
    return VerifyText(text) ? "accepted" : "wrong";
  } catch (const Tarvel::Xml::Security::XmlSecurityException &exception) {
    return exception.what();
  }
}

/// `RefusalOf` the genuine token with `from` replaced by `to`.
inline std::string Refusal(std::string_view from, std::string_view to) {
  return RefusalOf(Replaced(GenuineToken(), from, to));
}

} // namespace Testing
