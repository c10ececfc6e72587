// SPDX-License-Identifier: Apache-2.0
// Neither a passphrase nor a private key may stay in the heap.

#include "integration/secret_wiping/freed_memory.h"
#include "support/data_file.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <gtest/gtest.h>

#include <string>

namespace Tarvel::Crypto {
namespace {

using ::Testing::DataPath;
using ::Testing::FreedMemoryWatch;
using ::Testing::ReadDataFile;

// Wrong for every test file, and too long for a string's inline buffer.
const char PASSPHRASE[] = "correct-horse-battery-staple-and-more-than-fits-into-the-string-itself";

std::string GivePassphrase() {
  return PASSPHRASE;
}

/// A line from the middle of the Base64 text of a key.
std::string LineOf(const std::string &pem) {
  const std::size_t begin = pem.find('\n', pem.size() / 2) + 1;
  return pem.substr(begin, pem.find('\n', begin) - begin);
}

TEST(LoadPrivateKey, LeavesNoPassphraseInFreedMemory) {
  for (const char *const file :
       {"rsa2048-traditional-encrypted.key", "rsa2048-encrypted.key", "rsa2048-encrypted.key.der"}) {
    for (const char *const scheme : {"", "file:"}) {
      const std::string path = scheme + DataPath(std::string("crypto/") + file);
      const FreedMemoryWatch watch(PASSPHRASE);
      EXPECT_THROW(LoadPrivateKey(path, GivePassphrase), WrongPassphraseException) << path;
      EXPECT_EQ(watch.Found(), 0) << path;
    }
  }
}

TEST(LoadKeyStore, LeavesNoPassphraseInFreedMemory) {
  const std::string path = DataPath("crypto/rsa2048.p12");
  const FreedMemoryWatch watch(PASSPHRASE);
  EXPECT_THROW(LoadKeyStore(path, GivePassphrase), WrongPassphraseException);
  EXPECT_EQ(watch.Found(), 0);
}

TEST(LoadPrivateKey, LeavesNothingOfTheFileInFreedMemory) {
  for (const char *const file : {"rsa2048.key", "p256.key", "rsa2048-traditional.key", "certificate-then-key.pem"}) {
    const std::string path = DataPath(std::string("crypto/") + file);
    const std::string line = LineOf(ReadDataFile(std::string("crypto/") + file));
    ASSERT_GT(line.size(), 10U);
    const FreedMemoryWatch watch(line.c_str());
    EXPECT_TRUE(LoadPrivateKey(path));
    EXPECT_EQ(watch.Found(), 0) << path;
  }
}

TEST(LoadCertificates, LeavesNothingOfARefusedFileWithAKeyInFreedMemory) {
  const std::string line = LineOf(ReadDataFile("crypto/rsa2048.key"));
  const std::string path = DataPath("crypto/rsa2048.key");
  const FreedMemoryWatch watch(line.c_str());
  EXPECT_THROW(LoadCertificates(path), CryptoException);
  EXPECT_EQ(watch.Found(), 0);
}

} // namespace
} // namespace Tarvel::Crypto
