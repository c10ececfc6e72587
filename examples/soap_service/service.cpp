// SPDX-License-Identifier: Apache-2.0
/// @file
/// A SOAP service that accepts only messages that are signed with the key of the token in them.
///
/// Usage: soap_service sts.pem https://orders.corp.example/ 8080

#include "orders.h"

#include <tarvel/crypto/certificate.h>

#include <cstdlib>
#include <exception>
#include <iostream>
#include <string>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

// How many messages it remembers at once. Each takes less than 100 bytes, and is remembered for at most seven minutes.
constexpr std::size_t REMEMBERED = 100'000;

} // namespace

int main(int argc, char **argv) {
  if (argc != 4 && argc != 5) {
    std::cerr << "usage: soap_service SIGNER-FILE OUR-AUDIENCE PORT [REMEMBERED-MESSAGES]\n";
    return USAGE;
  }
  try {
    const std::size_t remembered = argc == 5 ? std::strtoul(argv[4], nullptr, 10) : REMEMBERED;
    const Example::Orders orders(Tarvel::Crypto::LoadCertificates(argv[1]), argv[2], remembered);
    Example::Serve(static_cast<unsigned short>(std::atoi(argv[3])),
                   [&orders](const std::string &message) { return orders.Answer(message); });
    return DONE;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // a file, the port or the number is wrong
    return FAILED;
  }
}
