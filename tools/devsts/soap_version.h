// SPDX-License-Identifier: Apache-2.0
/// @file
/// The two versions of SOAP.

#pragma once

#include "names.h"

#include <string_view>

namespace DevSts {

struct SoapVersion {
  Namespace ns;
  const char *name;
  std::string_view mediaType;
  const char *roleAttribute; ///< states the receiver of a header block
};

inline bool operator==(const SoapVersion &left, const SoapVersion &right) {
  return std::string_view(left.ns.uri) == right.ns.uri;
}

constexpr SoapVersion SOAP_1_1{Ns::SOAPENV, "SOAP 1.1", "text/xml", "actor"};
constexpr SoapVersion SOAP_1_2{Ns::SOAP12, "SOAP 1.2", "application/soap+xml", "role"};

} // namespace DevSts
