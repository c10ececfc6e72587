// SPDX-License-Identifier: Apache-2.0
// Neither a passphrase nor a private key may stay in the heap. This program replaces the allocation functions of C++, and
// searches each piece of memory when it is freed.

#include "support/data_file.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <gtest/gtest.h>

#include <malloc.h>

#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <new>
#include <string>

namespace {

std::atomic<const char *> g_secret{nullptr}; // not owned; null while nothing is searched for
std::atomic<int> g_found{0};

void *Allocate(std::size_t bytes) {
  // Zeroed, so that nothing of the previous owner is found.
  void *const memory = std::calloc(1, bytes ? bytes : 1);
  if (!memory) {
    throw std::bad_alloc();
  }
  return memory;
}

void Free(void *memory) noexcept {
  const char *const secret = g_secret.load();
  if (secret && memory && memmem(memory, malloc_usable_size(memory), secret, std::strlen(secret))) {
    ++g_found;
  }
  std::free(memory);
}

} // namespace

void *operator new(std::size_t bytes) {
  return Allocate(bytes);
}
void *operator new[](std::size_t bytes) {
  return Allocate(bytes);
}
void operator delete(void *memory) noexcept {
  Free(memory);
}
void operator delete[](void *memory) noexcept {
  Free(memory);
}
void operator delete(void *memory, std::size_t) noexcept {
  Free(memory);
}
void operator delete[](void *memory, std::size_t) noexcept {
  Free(memory);
}

namespace Tarvel::Crypto {
namespace {

using ::Testing::DataPath;
using ::Testing::ReadDataFile;

/// Counts the pieces of memory that are freed with `secret` in them while it lives.
class Watch {
public:
  explicit Watch(const char *secret) {
    g_found = 0;
    g_secret = secret;
  }
  Watch(const Watch &) = delete;
  Watch &operator=(const Watch &) = delete;
  ~Watch() { g_secret = nullptr; }

  int GetFound() const { return g_found; }
};

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

TEST(Watch, FindsASecretThatIsNotWiped) {
  const Watch watch(PASSPHRASE);
  delete new std::string(GivePassphrase() + "x");
  EXPECT_GT(watch.GetFound(), 0);
}

TEST(LoadPrivateKey, LeavesNoPassphraseInFreedMemory) {
  for (const char *const file :
       {"rsa2048-traditional-encrypted.key", "rsa2048-encrypted.key", "rsa2048-encrypted.key.der"}) {
    for (const char *const scheme : {"", "file:"}) {
      const std::string path = scheme + DataPath(std::string("crypto/") + file);
      const Watch watch(PASSPHRASE);
      EXPECT_THROW(LoadPrivateKey(path, GivePassphrase), WrongPassphraseException) << path;
      EXPECT_EQ(watch.GetFound(), 0) << path;
    }
  }
}

TEST(LoadKeyStore, LeavesNoPassphraseInFreedMemory) {
  const std::string path = DataPath("crypto/rsa2048.p12");
  const Watch watch(PASSPHRASE);
  EXPECT_THROW(LoadKeyStore(path, GivePassphrase), WrongPassphraseException);
  EXPECT_EQ(watch.GetFound(), 0);
}

TEST(LoadPrivateKey, LeavesNothingOfTheFileInFreedMemory) {
  for (const char *const file : {"rsa2048.key", "p256.key", "rsa2048-traditional.key", "certificate-then-key.pem"}) {
    const std::string path = DataPath(std::string("crypto/") + file);
    const std::string line = LineOf(ReadDataFile(std::string("crypto/") + file));
    ASSERT_GT(line.size(), 10U);
    const Watch watch(line.c_str());
    EXPECT_TRUE(LoadPrivateKey(path));
    EXPECT_EQ(watch.GetFound(), 0) << path;
  }
}

TEST(LoadCertificates, LeavesNothingOfARefusedFileWithAKeyInFreedMemory) {
  const std::string line = LineOf(ReadDataFile("crypto/rsa2048.key"));
  const std::string path = DataPath("crypto/rsa2048.key");
  const Watch watch(line.c_str());
  EXPECT_THROW(LoadCertificates(path), CryptoException);
  EXPECT_EQ(watch.GetFound(), 0);
}

} // namespace
} // namespace Tarvel::Crypto
