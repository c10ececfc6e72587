// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParsedSaml2`, what the parser of the profile SAML2 reads and refuses, and the assertions with which it is tested.

#pragma once

#include "support/parsed_document.h"
#include "support/recorded_deviations.h"
#include "token/saml2_parser.h"
#include "unit/token/assertion_text.h"

#include <string>
#include <vector>

namespace Testing {

/// A document, and what the parser reads in it when it continues after deviations. The constructor also expects that
/// the first deviation is the exception of a parser that does not continue.
struct ParsedSaml2 {
  explicit ParsedSaml2(const std::string &text) : document(text) {
    deviations = DeviationsOf([&](SsoClient::DeviationSink &sink) {
      SsoClient::NodeFilterIterator iterator = document.Cursor();
      SsoClient::Saml2Assertion parsed;
      SsoClient::ParseSaml2AssertionElement(iterator, parsed, sink);
      if (&sink != &SsoClient::ThrowingSink()) {
        EXPECT_EQ(nullptr, iterator.node);
        record = parsed;
      }
    });
  }

  /// "message | element" of each deviation.
  std::vector<std::string> Messages() const {
    std::vector<std::string> messages;
    for (const ExpectedDeviation &deviation : deviations) {
      messages.push_back(deviation.message + " | " + deviation.element);
    }
    return messages;
  }

  ParsedDocument document;
  SsoClient::Saml2Assertion record;
  std::vector<ExpectedDeviation> deviations;
};

/// What the parser reads in a text that it must accept.
struct Accepted : ParsedSaml2, SsoClient::Saml2Assertion {
  explicit Accepted(const std::string &text) : ParsedSaml2(text), Saml2Assertion(ParsedSaml2::record) {
    EXPECT_EQ(std::vector<ExpectedDeviation>(), deviations);
  }
};

inline Accepted AcceptedSaml2(const std::string &text) {
  return Accepted(text);
}

/// `BearerAssertion` with `from` replaced by `to`.
inline std::string ChangedBearer(const std::string &from, const std::string &to) {
  return ReplaceOnce(BearerAssertion(), from, to);
}

/// A bearer assertion with this subject and nothing optional.
inline std::string AssertionAbout(const std::string &subject) {
  return Assertion({Piece::ISSUER, Piece::SIGNATURE, subject, Piece::Conditions("")});
}

/// The same with these confirmations.
inline std::string AssertionConfirmedBy(const std::string &confirmations) {
  return AssertionAbout(Piece::Subject(Piece::SUBJECT_NAME, confirmations));
}

/// The same with these conditions.
inline std::string AssertionUnder(const std::string &conditions) {
  return Assertion({Piece::ISSUER, Piece::SIGNATURE, Piece::BearerSubject(), Piece::Conditions(conditions)});
}

/// The same with these elements after the conditions.
inline std::string AssertionStating(const std::string &statements) {
  return Assertion({Piece::ISSUER, Piece::SIGNATURE, Piece::BearerSubject(), Piece::Conditions(""), statements});
}

/// The same with these attributes.
inline std::string AssertionWithAttributes(const std::string &attributes) {
  return AssertionStating("<saml:AttributeStatement>" + attributes + "</saml:AttributeStatement>");
}

} // namespace Testing
