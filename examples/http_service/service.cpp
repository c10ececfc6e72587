// SPDX-License-Identifier: Apache-2.0
/// @file
/// An HTTP service that accepts only requests that are signed with the key of the token in them.
///
/// Usage: http_service sts.pem https://notes.corp.example 8080

#include "notes.h"

#include <tarvel/crypto/certificate.h>

#include <cstdlib>
#include <exception>
#include <iostream>
#include <string>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

// How many requests it remembers at once. Each takes less than 100 bytes, and is remembered for at most seven minutes.
constexpr std::size_t REMEMBERED = 100'000;

} // namespace

int main(int argc, char **argv) {
  if (argc != 4 && argc != 5) {
    std::cerr << "usage: http_service SIGNER-FILE OUR-ORIGIN PORT [REMEMBERED-REQUESTS]\n";
    return USAGE;
  }
  try {
    const std::size_t remembered = argc == 5 ? std::strtoul(argv[4], nullptr, 10) : REMEMBERED;
    const Example::Notes notes(Tarvel::Crypto::LoadCertificates(argv[1]), argv[2], remembered);
    Example::Serve(static_cast<unsigned short>(std::atoi(argv[3])),
                   [&notes](const Example::Request &request) { return notes.Answer(request); });
    return DONE;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // a file, the port or the number is wrong
    return FAILED;
  }
}
