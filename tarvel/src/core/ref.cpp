// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/ref.h>

namespace Tarvel {

Object::~Object() = default;

} // namespace Tarvel
