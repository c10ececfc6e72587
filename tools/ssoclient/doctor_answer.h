// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the body of an answer is, and whether a WS-Trust service wrote it.

#pragma once

#include "doctor_check.h"

#include <tarvel/xml/qname.h>

#include <string>
#include <string_view>

namespace SsoClient::Tool {

/// What a body is, as far as its first elements show.
struct ServiceAnswer {
  enum class Kind {
    EMPTY,
    HTML,
    TEXT,           ///< neither XML nor HTML
    MALFORMED,      ///< looks like XML, but is not well-formed
    XML,            ///< XML that is not a SOAP envelope
    SOAP_12,        ///< an envelope of SOAP 1.2
    SOAP_11_FAULT,  ///< an envelope of SOAP 1.1 with a fault
    SOAP_11_MESSAGE ///< any other envelope of SOAP 1.1
  };

  Kind kind = Kind::EMPTY;
  Tarvel::Xml::QName element; ///< the document element of XML; the first element in the body of a message
  std::string problem;        ///< of MALFORMED and TEXT: the parser's message
  std::string faultCode;      ///< of a fault: as the service wrote it; empty if it has none
  Tarvel::Xml::QName
      faultName; ///< the code with its prefix resolved; its namespace is empty if the prefix is not bound
  std::string faultText;
};

/// @param contentType the header's value; may be empty
/// @throws nothing because of the body
ServiceAnswer ReadAnswer(const std::string &body, std::string_view contentType);

/// The kind's name in JSON, such as "soap 1.1 fault", and for people, such as "a SOAP 1.1 fault".
const char *NameOf(ServiceAnswer::Kind kind);
const char *DescriptionOf(ServiceAnswer::Kind kind);

/// Whether a WS-Trust service that this client can use wrote the answer.
/// @param answer null without an answer
DoctorCheck CheckTrust(const ServiceAnswer *answer);

} // namespace SsoClient::Tool
