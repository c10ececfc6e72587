// SPDX-License-Identifier: Apache-2.0

#include "fixtures.h"
#include "support/throws_message.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <openssl/err.h>

#include <cstdio>
#include <cstdlib>
#include <unistd.h>

namespace Tarvel::Crypto {

namespace {

using Testing::DecodeCertificate;
using ::testing::ElementsAre;
using Testing::FixtureCertificate;
using Testing::FixturePath;
using ::testing::HasSubstr;
using Testing::ReadFixture;
using ::testing::StartsWith;

std::vector<std::string> SubjectsOf(const CertificateList &certificates) {
  std::vector<std::string> subjects;
  for (const Ref<const Certificate> &certificate : certificates) {
    subjects.push_back(certificate->GetSubject());
  }
  return subjects;
}

template <typename Function>
std::string CryptoMessage(Function function) {
  try {
    function();
  } catch (const CryptoException &error) {
    return error.what();
  }
  return "nothing was thrown";
}

// A file with `content` in the temporary folder, removed with this object.
class TemporaryFile {
public:
  explicit TemporaryFile(const std::string &content) {
    const int descriptor = mkstemp(m_path.data());
    if (descriptor < 0 || write(descriptor, content.data(), content.size()) != static_cast<ssize_t>(content.size())) {
      throw std::runtime_error("cannot write " + m_path);
    }
    close(descriptor);
  }
  TemporaryFile(const TemporaryFile &) = delete;
  TemporaryFile &operator=(const TemporaryFile &) = delete;
  ~TemporaryFile() { unlink(m_path.c_str()); }

  const std::string &GetPath() const { return m_path; }

private:
  std::string m_path = ::testing::TempDir() + "tarvel_crypto_XXXXXX";
};

TEST(Certificate, ReportsItsNamesInTheFormOfRfc2253) {
  const auto certificate = FixtureCertificate("rsa2048");
  EXPECT_EQ(certificate->GetSubject(), "CN=rsa2048,O=Example");
  EXPECT_EQ(certificate->GetIssuer(), "CN=rsa2048,O=Example");
}

TEST(Certificate, EscapesSpecialCharactersInNamesAndKeepsUtf8) {
  EXPECT_EQ(FixtureCertificate("names")->GetSubject(), "CN=Zoë \\+ \\\"Ω\\\",O=Exämple\\, Inc.");
}

TEST(Certificate, ReportsTheSameThumbprintAsOpenssl) {
  EXPECT_EQ(FixtureCertificate("rsa2048")->GetSha256Thumbprint(), ReadFixture("rsa2048.sha256"));
}

TEST(Certificate, ReportsItsValidity) {
  const auto certificate = FixtureCertificate("p256");
  EXPECT_EQ(certificate->GetNotBefore(), System::DateTime("2020-01-02T03:04:05Z"));
  EXPECT_EQ(certificate->GetNotAfter(), System::DateTime("2120-01-02T03:04:05Z"));
}

TEST(Certificate, KeepsItsDerEncoding) {
  const std::string der = ReadFixture("rsa2048.crt.der");
  const auto certificate = DecodeCertificate(der);
  EXPECT_EQ(std::string(certificate->GetDer().begin(), certificate->GetDer().end()), der);
  EXPECT_EQ(certificate->GetDer(), FixtureCertificate("rsa2048")->GetDer());
}

TEST(Certificate, WritesItselfAsPem) {
  const auto certificate = FixtureCertificate("rsa2048");
  EXPECT_EQ(certificate->ToPem(), ReadFixture("rsa2048.crt"));
}

TEST(Certificate, DecodesWithAnotherKindOfKey) {
  EXPECT_EQ(FixtureCertificate("ed25519")->GetSubject(), "CN=ed25519,O=Example");
}

TEST(CreateCertificateFromDer, RefusesEveryPrefix) {
  const std::string der = ReadFixture("rsa2048.crt.der");
  for (std::size_t length = 0; length < der.size(); ++length) {
    EXPECT_THROW(DecodeCertificate(der.substr(0, length)), CryptoException) << length << " bytes";
  }
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST(CreateCertificateFromDer, RefusesEmptyInput) {
  EXPECT_THROWS_MESSAGE(CreateCertificateFromDer(nullptr, 0), CryptoException,
                        "Certificate of 0 bytes does not decode");
}

TEST(CreateCertificateFromDer, RefusesBytesAfterTheCertificate) {
  EXPECT_THROWS_MESSAGE(DecodeCertificate(ReadFixture("rsa2048.crt.der") + "xy"), CryptoException,
                        "Certificate is followed by 2 further bytes");
}

TEST(CreateCertificateFromDer, RefusesAnEncodingThatIsOnlyBer) {
  std::string der = ReadFixture("rsa2048.crt.der");
  // 30 82 hi lo ... becomes 30 83 00 hi lo ...: the same length in a longer encoding than necessary.
  ASSERT_EQ(der.substr(0, 2), "\x30\x82");
  der[1] = '\x83';
  der.insert(2, 1, '\0');
  EXPECT_THROWS_MESSAGE(DecodeCertificate(der), CryptoException,
                        "Certificate is not in the distinguished encoding (DER)");
}

TEST(CreateCertificateFromDer, RefusesBerInsideTheSignedPart) {
  std::string der = ReadFixture("rsa2048.crt.der");
  // The length of the inner sequence takes one byte more, so the outer sequence is one byte longer.
  ASSERT_EQ(der.substr(4, 2), "\x30\x82");
  der[5] = '\x83';
  der.insert(6, 1, '\0');
  der[3] = static_cast<char>(der[3] + 1);
  EXPECT_THROWS_MESSAGE(DecodeCertificate(der), CryptoException,
                        "Certificate is not in the distinguished encoding (DER)");
}

TEST(CreateCertificateFromDer, DecodesOrThrowsCryptoExceptionForEveryChangedByte) {
  const std::string der = ReadFixture("p256.crt.der");
  int refused = 0;
  for (std::size_t at = 0; at < der.size(); ++at) {
    for (const char flip : {'\x01', '\x80', '\xff'}) {
      std::string changed = der;
      changed[at] = static_cast<char>(changed[at] ^ flip);
      try {
        const auto certificate = DecodeCertificate(changed);
        EXPECT_FALSE(certificate->ToPem().empty());
      } catch (const CryptoException &) {
        ++refused;
      }
    }
  }
  EXPECT_GT(refused, 100);
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST(CreateCertificateFromPem, RefusesTextWithoutACertificate) {
  for (const std::string &text : {std::string(), std::string("hello"), ReadFixture("rsa2048.key")}) {
    EXPECT_THROWS_MESSAGE(CreateCertificateFromPem(text), CryptoException, "There is no certificate in the text");
  }
}

TEST(CreateCertificateFromPem, ReturnsTheFirstOfSeveral) {
  EXPECT_EQ(CreateCertificateFromPem(ReadFixture("bundle.pem"))->GetSubject(), "CN=rsa2048,O=Example");
}

TEST(CreateCertificateFromPem, IncludesTheTextOfOpensslInItsMessage) {
  std::string pem = ReadFixture("rsa2048.crt");
  pem[40] = '*';
  const std::string message = CryptoMessage([&] { CreateCertificateFromPem(pem); });
  EXPECT_THAT(message, StartsWith("Malformed PEM text: error:"));
  EXPECT_THAT(message, HasSubstr("bad base64 decode"));
}

TEST(CreateCertificatesFromPem, ReturnsAllInOrderAndSkipsTheTextBetween) {
  const CertificateList certificates = CreateCertificatesFromPem(ReadFixture("bundle.pem"));
  EXPECT_THAT(SubjectsOf(certificates),
              ElementsAre("CN=rsa2048,O=Example", "CN=p256,O=Example", "CN=rsa3072,O=Example"));
}

TEST(CreateCertificatesFromPem, RefusesTextWithAPrivateKey) {
  EXPECT_THROWS_MESSAGE(CreateCertificatesFromPem(ReadFixture("bundle-with-key.pem")), CryptoException,
                        "Holds a private key (PRIVATE KEY) where only certificates belong");
  EXPECT_THROWS_MESSAGE(CreateCertificatesFromPem(ReadFixture("rsa2048-traditional-encrypted.key")), CryptoException,
                        "Holds a private key (RSA PRIVATE KEY) where only certificates belong");
}

TEST(CreateCertificatesFromPem, NeverLosesACertificateOfATruncatedBundle) {
  const std::string bundle = ReadFixture("bundle.pem");
  const std::string mark = "-----END CERTIFICATE-----";
  for (std::size_t length = 0; length < bundle.size(); ++length) {
    const std::string prefix = bundle.substr(0, length);
    std::size_t begun = 0;
    for (std::size_t at = prefix.find("-----BEGIN "); at != std::string::npos;
         at = prefix.find("-----BEGIN ", at + 1)) {
      ++begun;
    }
    try {
      EXPECT_EQ(CreateCertificatesFromPem(prefix).size(), begun) << length << " bytes";
    } catch (const CryptoException &) {
    }
  }
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST(LoadCertificates, ReadsPemAndDer) {
  EXPECT_EQ(LoadCertificates(FixturePath("bundle.pem")).size(), 3U);
  EXPECT_THAT(SubjectsOf(LoadCertificates(FixturePath("rsa2048.crt.der"))), ElementsAre("CN=rsa2048,O=Example"));
}

TEST(LoadCertificates, NamesTheFileThatCannotBeRead) {
  EXPECT_THROWS_MESSAGE(LoadCertificates("/nowhere/trust.pem"), IOException,
                        "Cannot open /nowhere/trust.pem: No such file or directory");
}

TEST(LoadCertificates, NamesTheFileThatContainsAKey) {
  const std::string pem = FixturePath("bundle-with-key.pem");
  EXPECT_THROWS_MESSAGE(LoadCertificates(pem), CryptoException,
                        pem + ": Holds a private key (PRIVATE KEY) where only certificates belong");
  const std::string der = FixturePath("rsa2048.key.der");
  EXPECT_THROWS_MESSAGE(LoadCertificates(der), CryptoException,
                        der + ": Holds a private key (DER) where only certificates belong");
}

TEST(LoadCertificates, NamesTheFileWithoutACertificate) {
  const TemporaryFile empty("");
  EXPECT_THROWS_MESSAGE(LoadCertificates(empty.GetPath()), CryptoException,
                        empty.GetPath() + ": There is no certificate in the text");
}

TEST(LoadCertificates, RefusesAnEndlessFile) {
  EXPECT_THROWS_MESSAGE(LoadCertificates("/dev/zero"), CryptoException,
                        "/dev/zero: file is longer than 16777216 bytes");
}

} // namespace

} // namespace Tarvel::Crypto
