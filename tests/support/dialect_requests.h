// SPDX-License-Identifier: Apache-2.0
/// @file
/// Sample requests in dialects other than the default. Each has the name of its golden file.

#pragma once

#include "support/sample_requests.h"

#include <ssoclient/service_dialect.h>

#include <vector>

namespace Testing {

/// The service's address in the samples.
extern const char *const SAMPLE_SERVICE;

/// A dialect in which each switch differs from the default.
SsoClient::ServiceDialect FullDialect();

/// At least one request for each switch.
std::vector<SampleRequest> DialectRequests();

/// The samples in the default dialect, then those in others.
std::vector<SampleRequest> SampleRequestsInAllDialects();

} // namespace Testing
