// SPDX-License-Identifier: Apache-2.0

#include "core/wiped_growth.h"

#include <tarvel/core/secure_wipe.h>

#include <algorithm>

namespace Tarvel {

void AppendWiping(std::string &text, std::string_view bytes) {
  if (text.capacity() - text.size() < bytes.size()) {
    std::string larger;
    larger.reserve(std::max(2 * text.capacity(), text.size() + bytes.size()));
    larger.append(text);
    SecureWipe(text); // before `swap`, which leaves bytes of a short text in the object where nothing reaches them
    text.swap(larger);
  }
  text.append(bytes);
}

} // namespace Tarvel
