// SPDX-License-Identifier: Apache-2.0
/// @file
/// The files of tests/data/crypto, as the tests read them.

#pragma once

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>

namespace Testing {

inline const std::string PASSPHRASE = "open sesame";

inline std::string FixturePath(const std::string &name) {
  return TEST_DATA_DIR "/crypto/" + name;
}

inline std::string ReadFixture(const std::string &name) {
  std::ifstream file(FixturePath(name), std::ios::binary);
  if (!file) {
    throw std::runtime_error("no fixture " + name);
  }
  return {std::istreambuf_iterator<char>(file), {}};
}

inline Tarvel::Ref<const Tarvel::Crypto::Certificate> FixtureCertificate(const std::string &name) {
  return Tarvel::Crypto::CreateCertificateFromPem(ReadFixture(name + ".crt"));
}

inline Tarvel::Ref<const Tarvel::Crypto::PrivateKey> FixtureKey(const std::string &name) {
  return Tarvel::Crypto::CreatePrivateKey(ReadFixture(name + ".key"));
}

inline Tarvel::Ref<const Tarvel::Crypto::Certificate> DecodeCertificate(const std::string &der) {
  return Tarvel::Crypto::CreateCertificateFromDer(reinterpret_cast<const std::uint8_t *>(der.data()), der.size());
}

} // namespace Testing
