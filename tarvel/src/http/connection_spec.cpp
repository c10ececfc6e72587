// SPDX-License-Identifier: Apache-2.0

#include <tarvel/http/connection_spec.h>

namespace Tarvel {
namespace Http {

ConnectionSpec::~ConnectionSpec() = default;

CustomConnectionSpec::~CustomConnectionSpec() = default;

} // namespace Http
} // namespace Tarvel
