// SPDX-License-Identifier: Apache-2.0

#include <tarvel/http/connection_spec.h>

namespace Tarvel::Http {

ConnectionSpec::~ConnectionSpec() = default;

CustomConnectionSpec::~CustomConnectionSpec() = default;

} // namespace Tarvel::Http
