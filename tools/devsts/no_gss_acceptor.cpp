// SPDX-License-Identifier: Apache-2.0
// Replaces gss_acceptor.cpp in a build without the GSSAPI.

#include "gss_acceptor.h"

#include <stdexcept>

namespace DevSts {

std::unique_ptr<const GssAcceptor> CreateGssAcceptor(const std::filesystem::path &, const std::filesystem::path &) {
  throw std::runtime_error("--keytab: this program was built without the GSSAPI and cannot negotiate");
}

} // namespace DevSts
