// SPDX-License-Identifier: Apache-2.0

#include "fixtures.h"
#include "support/throws_message.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <openssl/err.h>

#include <ostream>
#include <type_traits>

namespace Tarvel::Crypto {

namespace {

using Testing::FixtureCertificate;
using Testing::FixtureKey;
using Testing::FixturePath;
using ::testing::HasSubstr;
using Testing::PASSPHRASE;
using Testing::ReadFixture;
using ::testing::StartsWith;

std::string GivePassphrase() {
  return PASSPHRASE;
}

std::string GiveWrongPassphrase() {
  return "shut sesame";
}

template <typename Expected, typename Function>
std::string MessageOf(Function function) {
  try {
    function();
  } catch (const Exception &error) {
    EXPECT_EQ(typeid(error), typeid(Expected)) << error.what();
    return error.what();
  }
  ADD_FAILURE() << "nothing was thrown";
  return "";
}

template <typename T, typename = void>
struct IsPrintable : std::false_type {};
template <typename T>
struct IsPrintable<T, std::void_t<decltype(std::declval<std::ostream &>() << std::declval<const T &>())>>
    : std::true_type {};

static_assert(IsPrintable<std::string>::value);
static_assert(!IsPrintable<PrivateKey>::value, "a private key must not find its way into a log");
static_assert(!IsPrintable<Ref<const PrivateKey>>::value);

struct KeyForm {
  const char *file;
  const char *certificate; // of the same key
  bool encrypted;
};

void PrintTo(const KeyForm &form, std::ostream *out) {
  *out << form.file;
}

class CreatePrivateKeyTest : public ::testing::TestWithParam<KeyForm> {};

TEST_P(CreatePrivateKeyTest, DecodesEachFormAndAsksOnceForThePassphraseIfEncrypted) {
  int asked = 0;
  const auto key = CreatePrivateKey(ReadFixture(GetParam().file), [&asked] {
    ++asked;
    return PASSPHRASE;
  });
  EXPECT_EQ(asked, GetParam().encrypted ? 1 : 0);
  RequireKeyMatchesCertificate(*key, *FixtureCertificate(GetParam().certificate));
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST_P(CreatePrivateKeyTest, LoadsFromAFileOrAFileUri) {
  const std::string path = FixturePath(GetParam().file);
  const auto fromFile = LoadPrivateKey(path, GivePassphrase);
  RequireKeyMatchesCertificate(*fromFile, *FixtureCertificate(GetParam().certificate));
  const auto fromUri = LoadPrivateKey("file:" + path, GivePassphrase);
  RequireKeyMatchesCertificate(*fromUri, *FixtureCertificate(GetParam().certificate));
}

TEST_P(CreatePrivateKeyTest, RefusesAWrongOrMissingPassphraseWhenEncrypted) {
  if (!GetParam().encrypted) {
    EXPECT_TRUE(CreatePrivateKey(ReadFixture(GetParam().file)));
    return;
  }
  const std::string text = ReadFixture(GetParam().file);
  const std::string message = MessageOf<WrongPassphraseException>([&] { CreatePrivateKey(text, GiveWrongPassphrase); });
  EXPECT_THAT(message, StartsWith("The passphrase of the private key is wrong"));
  EXPECT_THROWS_MESSAGE(CreatePrivateKey(text), WrongPassphraseException,
                        "The private key is encrypted and there is no passphrase");
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST_P(CreatePrivateKeyTest, RefusesEveryFourthPrefix) {
  std::string text = ReadFixture(GetParam().file);
  while (text.ends_with('\n')) {
    text.pop_back();
  }
  for (std::size_t length = 0; length < text.size(); length += 4) {
    EXPECT_THROW(CreatePrivateKey(text.substr(0, length), GivePassphrase), CryptoException) << length << " bytes";
  }
  EXPECT_EQ(ERR_peek_error(), 0U);
}

INSTANTIATE_TEST_SUITE_P(
    All, CreatePrivateKeyTest,
    ::testing::Values(
        KeyForm{"rsa2048.key", "rsa2048", false}, KeyForm{"rsa2048.key.der", "rsa2048", false},
        KeyForm{"rsa2048-traditional.key", "rsa2048", false}, KeyForm{"rsa2048-traditional.key.der", "rsa2048", false},
        KeyForm{"rsa2048-traditional-encrypted.key", "rsa2048", true},
        KeyForm{"rsa2048-encrypted.key", "rsa2048", true}, KeyForm{"rsa2048-encrypted.key.der", "rsa2048", true},
        KeyForm{"rsa2048-scrypt.key", "rsa2048", true}, KeyForm{"p256.key", "p256", false},
        KeyForm{"p256.key.der", "p256", false}, KeyForm{"p256-traditional.key", "p256", false},
        KeyForm{"p256-traditional.key.der", "p256", false}, KeyForm{"p256-traditional-encrypted.key", "p256", true},
        KeyForm{"p256-encrypted.key", "p256", true}, KeyForm{"p256-encrypted.key.der", "p256", true},
        KeyForm{"certificate-then-key.pem", "rsa2048", false}),
    [](const auto &form) { return Testing::TestName(form.param.file); });

TEST(PrivateKey, ReportsItsAlgorithmAndSize) {
  EXPECT_EQ(FixtureKey("rsa3072")->GetAlgorithm(), "RSA");
  EXPECT_EQ(FixtureKey("rsa3072")->GetBits(), 3072U);
  EXPECT_EQ(FixtureKey("p521")->GetAlgorithm(), "EC");
  EXPECT_EQ(FixtureKey("p521")->GetBits(), 521U);
}

TEST(CreatePrivateKey, RefusesTextWithoutAKey) {
  for (const std::string &text : {std::string(), std::string("hello"), ReadFixture("rsa2048.crt")}) {
    EXPECT_THROWS_MESSAGE(CreatePrivateKey(text), NoKeyException, "There is no private key in the text");
  }
  EXPECT_THROWS_MESSAGE(CreatePrivateKey(ReadFixture("rsa2048.crt.der")), NoKeyException,
                        "There is a certificate, and no private key");
}

TEST(CreatePrivateKey, RefusesAnotherAlgorithm) {
  EXPECT_THROWS_MESSAGE(CreatePrivateKey(ReadFixture("ed25519.key")), CryptoException,
                        "Private key of algorithm ED25519, which is neither RSA nor EC");
}

TEST(CreatePrivateKey, RefusesBytesAfterTheKey) {
  for (const char *file : {"rsa2048.key.der", "rsa2048-traditional.key.der", "rsa2048-encrypted.key.der"}) {
    const std::string der = ReadFixture(file) + "x";
    EXPECT_THAT(MessageOf<CryptoException>([&] { CreatePrivateKey(der, GivePassphrase); }),
                StartsWith("The private key does not decode"))
        << file;
  }
}

TEST(CreatePrivateKey, DoesNotReportAnUnavailableCipherAsAWrongPassphrase) {
  const std::string text = ReadFixture("rsa2048-des.key");
  EXPECT_THAT(MessageOf<CryptoException>([&] { CreatePrivateKey(text, GivePassphrase); }),
              StartsWith("The private key cannot be decrypted: error:"));
}

TEST(CreatePrivateKey, RefusesAPassphraseLongerThanOpensslTakes) {
  const std::string text = ReadFixture("rsa2048-traditional-encrypted.key");
  MessageOf<WrongPassphraseException>([&] { CreatePrivateKey(text, [] { return std::string(1 << 16, 'x'); }); });
}

TEST(CreatePrivateKey, PassesOnTheExceptionOfThePassphraseCallback) {
  const std::string text = ReadFixture("rsa2048-encrypted.key");
  const auto fail = []() -> std::string { throw InvalidStateException("no terminal"); };
  EXPECT_THROWS_MESSAGE(CreatePrivateKey(text, fail), InvalidStateException, "no terminal");
  EXPECT_THROWS_MESSAGE(LoadPrivateKey("file:" + FixturePath("rsa2048-encrypted.key"), fail), InvalidStateException,
                        "no terminal");
}

TEST(LoadPrivateKey, BeginsItsMessageWithThePath) {
  const std::string certificate = FixturePath("rsa2048.crt");
  EXPECT_THROWS_MESSAGE(LoadPrivateKey(certificate), NoKeyException,
                        certificate + ": There is no private key in the text");
  const std::string encrypted = FixturePath("rsa2048-encrypted.key");
  EXPECT_THROWS_MESSAGE(LoadPrivateKey(encrypted), WrongPassphraseException,
                        encrypted + ": The private key is encrypted and there is no passphrase");
  EXPECT_THROWS_MESSAGE(LoadPrivateKey("/nowhere/client.key"), IOException,
                        "Cannot open /nowhere/client.key: No such file or directory");
}

TEST(LoadPrivateKey, AsksAtMostOnceForAStoreAndNeverOnTheTerminal) {
  int asked = 0;
  const std::string uri = "file:" + FixturePath("rsa2048-encrypted.key");
  const auto wrong = [&asked] {
    ++asked;
    return std::string("shut sesame");
  };
  EXPECT_THAT(MessageOf<WrongPassphraseException>([&] { LoadPrivateKey(uri, wrong); }), StartsWith(uri + ": "));
  EXPECT_EQ(asked, 1);
  EXPECT_THROWS_MESSAGE(LoadPrivateKey(uri), WrongPassphraseException,
                        uri + ": The private key is encrypted and there is no passphrase");
}

TEST(LoadPrivateKey, RefusesAStoreWithoutAKey) {
  const std::string uri = "file:" + FixturePath("rsa2048.crt");
  EXPECT_THROWS_MESSAGE(LoadPrivateKey(uri), NoKeyException, uri + ": There is no private key in the store");
}

TEST(LoadPrivateKey, RefusesAStoreThatDoesNotExist) {
  EXPECT_THAT(MessageOf<IOException>([] { LoadPrivateKey("file:/nowhere/client.key"); }),
              StartsWith("file:/nowhere/client.key: The key store cannot be read: "));
}

TEST(LoadPrivateKey, RefusesASchemeWithoutALoader) {
  const std::string message = MessageOf<CryptoException>([] { LoadPrivateKey("nosuchstore:object=sts"); });
  EXPECT_THAT(message, StartsWith("nosuchstore:object=sts: The key store cannot be read: error:"));
  EXPECT_THAT(message, HasSubstr("unregistered scheme"));
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST(LoadPrivateKey, TreatsAPathWithAColonAfterASlashAsAFile) {
  EXPECT_THROWS_MESSAGE(LoadPrivateKey("./key:1"), IOException, "Cannot open ./key:1: No such file or directory");
}

TEST(CreateKeyStoreFromPkcs12, ReturnsTheKeyItsCertificateAndTheOtherCertificates) {
  const KeyStore store = CreateKeyStoreFromPkcs12(ReadFixture("rsa2048.p12"), GivePassphrase);
  RequireKeyMatchesCertificate(*store.privateKey, *store.certificate);
  EXPECT_EQ(store.certificate->GetSubject(), "CN=rsa2048,O=Example");
  ASSERT_EQ(store.others.size(), 1U);
  EXPECT_EQ(store.others.front()->GetDer(), FixtureCertificate("p256")->GetDer());
  EXPECT_EQ(CreateKeyStoreFromPkcs12(ReadFixture("p256.p12"), GivePassphrase).privateKey->GetAlgorithm(), "EC");
}

TEST(CreateKeyStoreFromPkcs12, AsksForNoPassphraseWhenNoneIsNeeded) {
  const KeyStore store = CreateKeyStoreFromPkcs12(ReadFixture("rsa2048-no-passphrase.p12"),
                                                  []() -> std::string { throw InvalidStateException("asked"); });
  EXPECT_EQ(store.certificate->GetSubject(), "CN=rsa2048,O=Example");
}

TEST(CreateKeyStoreFromPkcs12, RefusesAWrongOrMissingPassphrase) {
  const std::string der = ReadFixture("rsa2048.p12");
  EXPECT_THAT(MessageOf<WrongPassphraseException>([&] { CreateKeyStoreFromPkcs12(der, GiveWrongPassphrase); }),
              StartsWith("The passphrase of the PKCS#12 key store is wrong"));
  EXPECT_THROWS_MESSAGE(CreateKeyStoreFromPkcs12(der, {}), WrongPassphraseException,
                        "The private key is encrypted and there is no passphrase");
}

TEST(CreateKeyStoreFromPkcs12, RefusesAStoreWithoutAKeyOrWithoutACertificate) {
  EXPECT_THROWS_MESSAGE(CreateKeyStoreFromPkcs12(ReadFixture("certificate-only.p12"), GivePassphrase), NoKeyException,
                        "There is no private key in the PKCS#12 key store");
  EXPECT_THROWS_MESSAGE(CreateKeyStoreFromPkcs12(ReadFixture("key-only.p12"), GivePassphrase), CryptoException,
                        "There is no certificate for the private key in the PKCS#12 key store");
}

TEST(CreateKeyStoreFromPkcs12, RefusesEveryPrefixAndBytesAfterTheStore) {
  const std::string der = ReadFixture("p256.p12");
  for (std::size_t length = 0; length < der.size(); ++length) {
    EXPECT_THROW(CreateKeyStoreFromPkcs12(der.substr(0, length), GivePassphrase), CryptoException) << length;
  }
  EXPECT_THROWS_MESSAGE(CreateKeyStoreFromPkcs12(der + "x", GivePassphrase), CryptoException,
                        "The PKCS#12 key store is followed by further bytes");
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST(LoadKeyStore, ReadsTheFile) {
  EXPECT_EQ(LoadKeyStore(FixturePath("rsa2048.p12"), GivePassphrase).privateKey->GetAlgorithm(), "RSA");
}

TEST(LoadKeyStore, IncludesThePathInEachMessage) {
  EXPECT_THROWS_MESSAGE(LoadKeyStore("/nowhere.p12", {}), Tarvel::IOException,
                        "Cannot open /nowhere.p12: No such file or directory");
  EXPECT_THROWS_MESSAGE(LoadKeyStore(FixturePath("certificate-only.p12"), GivePassphrase), NoKeyException,
                        FixturePath("certificate-only.p12") + ": There is no private key in the PKCS#12 key store");
  EXPECT_THAT(
      MessageOf<WrongPassphraseException>([] { LoadKeyStore(FixturePath("rsa2048.p12"), GiveWrongPassphrase); }),
      testing::StartsWith(FixturePath("rsa2048.p12") + ": "));
}

TEST(RequireKeyMatchesCertificate, RefusesAnotherKeyOfTheSameAndOfAnotherKind) {
  const auto certificate = FixtureCertificate("rsa2048");
  const std::string message = "The private key does not belong to the certificate CN=rsa2048,O=Example";
  EXPECT_THROWS_MESSAGE(RequireKeyMatchesCertificate(*FixtureKey("rsa3072"), *certificate), KeyMismatchException,
                        message);
  EXPECT_THROWS_MESSAGE(RequireKeyMatchesCertificate(*FixtureKey("p256"), *certificate), KeyMismatchException, message);
  EXPECT_EQ(ERR_peek_error(), 0U);
}

} // namespace

} // namespace Tarvel::Crypto
