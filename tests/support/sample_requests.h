// SPDX-License-Identifier: Apache-2.0
/// @file
/// One request of each operation and variant, with every text and identifier fixed, under the name of its golden file.

#pragma once

#include "exchange/request.h"

#include <ssoclient/token_spec.h>

#include <functional>
#include <iosfwd>
#include <string>
#include <vector>

namespace Testing {

struct SampleRequest {
  const char *name;
  bool isSigned;
  std::function<void(SsoClient::Request &)> build;
};

void PrintTo(const SampleRequest &sample, std::ostream *out);

/// The sample's name in the form of test case names.
std::string TestName(const SampleRequest &sample);

/// The assertion that the samples present, renew and validate: one line of XML, its identifier "_0001".
std::string SampleTokenXml();

SsoClient::TokenSpec PlainSpec();

/// Everything that a spec can request, except a delegate.
SsoClient::TokenSpec FullSpec();

/// A spec in which every text field except the delegate has characters beyond ASCII.
SsoClient::TokenSpec BeyondAsciiSpec();

SsoClient::TokenSpec DelegatedSpec();

std::vector<SampleRequest> SampleRequests();

} // namespace Testing
