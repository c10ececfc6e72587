// SPDX-License-Identifier: Apache-2.0
/// @file
/// Functions that read the files of tests/data/crypto.

#pragma once

#include "support/data_file.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <algorithm>
#include <cstdint>
#include <string>

namespace Testing {

inline const std::string PASSPHRASE = "open sesame";

inline std::string FixturePath(const std::string &name) {
  return DataPath("crypto/" + name);
}

inline std::string ReadFixture(const std::string &name) {
  return ReadDataFile("crypto/" + name);
}

/// The name of a fixture in a form that is allowed in the name of a test case.
inline std::string TestName(std::string fixture) {
  std::replace_if(
      fixture.begin(), fixture.end(), [](char c) { return c == '-' || c == '.'; }, '_');
  return fixture;
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
