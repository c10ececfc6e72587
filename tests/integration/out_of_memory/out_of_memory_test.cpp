// SPDX-License-Identifier: Apache-2.0
// Whichever allocation of OpenSSL fails: an operation either succeeds or reports that there is no memory. It never has a
// wrong result, and never reports a fault of its input.
#include "integration/out_of_memory/failing_memory.h"
#include "support/completion.h"
#include "support/data_file.h"
#include "support/dev_sts.h"
#include "support/fixed_environment.h"
#include "support/report_texts.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/io/reader.h>
#include <tarvel/ssl/ssl_context.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <stdexcept>
#include <string>
#include <typeinfo>
#include <vector>

namespace {

using Tarvel::Ref;
using Testing::DataPath;
using Testing::FailingMemory;
using Testing::ReadDataFile;
using Testing::Shortage;

const std::string NO_MEMORY = "OutOfMemoryException: There is not enough memory";
const std::string TAMPERED =
    "InvalidSignatureException: Failed to verify signature: token might have been tampered with.";

/// "done", or the class and the message of the exception.
std::string OutcomeOf(const std::function<void()> &operation) {
  try {
    operation();
    return "done";
  } catch (const Tarvel::OutOfMemoryException &failure) {
    return std::string("OutOfMemoryException: ") + failure.what();
  } catch (const SsoClient::InvalidSignatureException &failure) {
    return std::string("InvalidSignatureException: ") + failure.what();
  } catch (const std::exception &failure) {
    return std::string(typeid(failure).name()) + ": " + failure.what();
  }
}

/// Runs the operation with every allocation failing in turn, until none is left to fail. Counts the outcomes.
std::map<std::string, int> Sweep(const std::function<void()> &operation, Shortage shortage, int step = 1) {
  std::map<std::string, int> outcomes;
  for (int number = 1;; number += step) {
    const FailingMemory memory(number, shortage);
    const std::string outcome = OutcomeOf(operation);
    if (!memory.HasFailed()) {
      return outcomes;
    }
    ++outcomes[outcome];
  }
}

/// `full` is the outcome with enough memory. Only every `step`th allocation fails in turn.
void ExpectNothingElse(const std::function<void()> &operation, const std::string &full = "done", int step = 1) {
  for (const Shortage shortage : {Shortage::ONCE, Shortage::FROM_THEN}) {
    std::map<std::string, int> outcomes = Sweep(operation, shortage, step);
    EXPECT_GT(outcomes[NO_MEMORY], 0);
    outcomes.erase(NO_MEMORY);
    outcomes.erase(full);
    EXPECT_EQ(outcomes, (std::map<std::string, int>{})) << (shortage == Shortage::ONCE ? "once" : "from then on");
  }
}

/// Also checks for leaks: the operation fails many times, so that even a small leak adds up.
class OutOfMemory : public testing::Test {
protected:
  void ExpectNothingElse(const std::function<void()> &operation, const std::string &full = "done", int step = 1) {
    ASSERT_EQ(OutcomeOf(operation), full);
    ASSERT_EQ(OutcomeOf(operation), full); // makes what is made once per process
    const long before = Testing::CountForeignAllocations();
    ::ExpectNothingElse(operation, full, step);
    EXPECT_LE(Testing::CountForeignAllocations() - before, 64); // caches that fill up
  }
};

std::string Token(const std::string &name) {
  return ReadDataFile("tokens/" + name + ".xml");
}

std::string Changed(std::string token) {
  return token.replace(token.find("alice"), 5, "malory");
}

Tarvel::Crypto::CertificateList LoadTrusted(const std::vector<std::string> &names) {
  Tarvel::Crypto::CertificateList trusted;
  for (const std::string &name : names) {
    trusted.push_back(Tarvel::Crypto::LoadCertificates(DataPath("tokens/" + name + ".crt")).front());
  }
  return trusted;
}

std::function<void()> Verification(const std::string &xml, const std::string &certificate) {
  const auto trusted = Tarvel::Crypto::LoadCertificates(DataPath("tokens/" + certificate + ".crt"));
  return [xml, trusted] { SsoClient::CreateSamlToken(xml, trusted); };
}

TEST_F(OutOfMemory, NeverCausesAGenuineTokenToBeRefused) {
  for (const char *const name : {"bearer", "holder-of-key", "rsa-pss-sha256"}) {
    SCOPED_TRACE(name);
    ExpectNothingElse(Verification(Token(name), "sts-rsa"));
  }
  ExpectNothingElse(Verification(Token("ecdsa-p256-sha256"), "sts-ec256"));
}

TEST_F(OutOfMemory, NeverCausesATamperedTokenToBeAccepted) {
  for (const char *const name : {"bearer", "rsa-pss-sha256"}) {
    SCOPED_TRACE(name);
    ExpectNothingElse(Verification(Changed(Token(name)), "sts-rsa"), TAMPERED);
    ExpectNothingElse(Verification(Token(name), "other"), TAMPERED);
  }
  ExpectNothingElse(Verification(Changed(Token("ecdsa-p256-sha256")), "sts-ec256"), TAMPERED);
}

// The certificate in KeyInfo is not trusted, so the report decodes it.
TEST_F(OutOfMemory, NeverChangesTheReportOnASignature) {
  const Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader(Token("bearer"));
  const Ref<Tarvel::Object> parsed =
      Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*reader);
  const auto &root = *dynamic_cast<Tarvel::Xml::Document &>(*parsed).GetDocumentElement();
  Ref<Tarvel::Xml::Security::Signature> signature;
  CreateSignatureFromDom(root, *root.FindChildElement("Signature"), signature);
  const auto resolver = Tarvel::Xml::Security::CreateTrustSetKeyResolver(LoadTrusted({"other", "sts-rsa-reissued"}));
  ExpectNothingElse([&] {
    const Tarvel::Xml::Security::SignatureReport report = signature->Explain(*resolver);
    const auto &stranger = report.namedCertificates.at(0);
    if (!report.refusals.empty() || !report.keys.at(1).madeSignature || stranger.subject.empty() ||
        stranger.thumbprint.empty()) {
      throw std::logic_error("another report");
    }
  });
}

TEST_F(OutOfMemory, IsReportedByVerificationOnTheFirstUseOfAKey) {
  const std::string pem = ReadDataFile("tokens/sts-rsa.crt");
  const std::string xml = Token("bearer");
  ExpectNothingElse([&] { SsoClient::CreateSamlToken(xml, {Tarvel::Crypto::CreateCertificateFromPem(pem)}); });
}

/// Explains the token in `file`, and fails if an incomplete report is returned.
std::function<void()> Explanation(const std::string &file, const std::string &certificate) {
  const SsoClient::TokenVerifier verifier(Tarvel::Crypto::LoadCertificates(DataPath("tokens/" + certificate + ".crt")));
  const std::string xml = ReadDataFile(file);
  const std::string whole = Testing::DescribeReport(verifier.Explain(xml));
  return [xml, verifier, whole] {
    if (Testing::DescribeReport(verifier.Explain(xml)) != whole) {
      throw std::logic_error("another report");
    }
  };
}

TEST_F(OutOfMemory, NeverLosesPartOfAReport) {
  const Testing::FixedEnvironment clock;
  ExpectNothingElse(Explanation("tokens/holder-of-key.xml", "sts-rsa"));
  ExpectNothingElse(Explanation("tokens/bearer.xml", "other"));
  ExpectNothingElse(Explanation("tokens/ecdsa-p256-sha256.xml", "sts-ec256"));
  ExpectNothingElse(Explanation("attacks/digest-resigned-first-bit.xml", "sts-rsa"));
  ExpectNothingElse(Explanation("attacks/foreign-certificate.xml", "sts-rsa"));
}

TEST_F(OutOfMemory, IsReportedByCertificates) {
  for (const char *const name : {"rsa2048.crt", "p256.crt", "names.crt", "rsa2048.crt.der", "bundle.pem"}) {
    SCOPED_TRACE(name);
    ExpectNothingElse([path = DataPath(std::string("crypto/") + name)] {
      const auto certificate = Tarvel::Crypto::LoadCertificates(path).front();
      certificate->GetSubject();
      certificate->GetSha256Thumbprint();
      certificate->ToPem();
    });
  }
}

TEST_F(OutOfMemory, IsReportedByPrivateKeys) {
  const auto answer = [] { return std::string("open sesame"); };
  // Each try derives a key from the passphrase, which is slow.
  for (const auto &[name, step] : std::map<std::string, int>{{"p256.key", 1},
                                                             {"p256.key.der", 1},
                                                             {"rsa2048-traditional.key", 1},
                                                             {"p256-traditional-encrypted.key", 3},
                                                             {"p256-encrypted.key", 41},
                                                             {"p256-encrypted.key.der", 43}}) {
    SCOPED_TRACE(name);
    const std::string path = DataPath("crypto/" + name);
    ExpectNothingElse([path, answer] { Tarvel::Crypto::LoadPrivateKey(path, answer); }, "done", step);
  }
  // Keys at a URI are left out: when memory runs out, OpenSSL 3.0's own loader uses null pointers.
}

TEST_F(OutOfMemory, IsReportedByKeyStores) {
  ExpectNothingElse(
      [path = DataPath("crypto/p256.p12")] {
        const auto store = Tarvel::Crypto::LoadKeyStore(path, [] { return std::string("open sesame"); });
        Tarvel::Crypto::RequireKeyMatchesCertificate(*store.privateKey, *store.certificate);
      },
      "done", 29);
}

void Sign(const Tarvel::Crypto::PrivateKey &key) {
  namespace Security = Tarvel::Xml::Security;
  Ref<Tarvel::Xml::ElementNode> root;
  Tarvel::Xml::CreateElementNode("", "root", root);
  root->DefineAttribute("ID", "_1");
  Ref<Security::Signature> signature;
  Security::CreateBlankSignature(root, Security::CanonicalizationUri::EXCLUSIVE,
                                 "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "ds", signature);
  signature->AddReference("#_1", "http://www.w3.org/2001/04/xmlenc#sha256", Security::CanonicalizationUri::EXCLUSIVE);
  signature->Sign(key);
}

TEST_F(OutOfMemory, IsReportedBySigning) {
  const auto key = Tarvel::Crypto::LoadPrivateKey(DataPath("crypto/rsa2048.key"));
  ExpectNothingElse([key] { Sign(*key); });
}

TEST_F(OutOfMemory, IsReportedByTlsContexts) {
  const auto key = Tarvel::Crypto::LoadPrivateKey(DataPath("tls/client.key"));
  const auto certificate = Tarvel::Crypto::LoadCertificates(DataPath("tls/client.crt")).front();
  ExpectNothingElse(
      [&] {
        const auto context = Tarvel::Ssl::CreateSSLContext();
        context->TrustFile(DataPath("tls/authority.crt"));
        context->SetClientCertificate(certificate, key, {});
      },
      "done", 3);
}

void Require(const Testing::Completion &completion) {
  if (completion.GetMessage().empty()) {
    return;
  }
  if (completion.FailedWith<Tarvel::OutOfMemoryException>()) {
    throw Tarvel::OutOfMemoryException();
  }
  throw std::runtime_error(completion.GetMessage());
}

/// Connects to the service and sends a request, to another endpoint each time, so that no session is resumed.
void Exchange(Tarvel::Ssl::SSLContext &context, int port) {
  static int endpoints = 0;
  const std::string request = "GET / HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n";
  const auto socket = Tarvel::System::CreateTcpClientSocket();
  Testing::Completion connected;
  socket->AsyncConnect("127.0.0.1", port, connected.ForEnd());
  Require(connected);
  const auto stream = context.CreateStream(socket, std::to_string(++endpoints));
  Testing::Completion handshake;
  stream->AsyncHandshake("localhost", "", handshake.ForEnd());
  Require(handshake);
  Testing::Completion written;
  stream->AsyncWrite(request.data(), request.size(), written.ForTransfer());
  Require(written);
  char buffer[16384];
  Testing::Completion read;
  stream->AsyncReadSome(buffer, sizeof buffer, read.ForTransfer());
  Require(read);
  stream->Close();
}

TEST_F(OutOfMemory, IsReportedByHandshakesReadsAndWrites) {
  const Testing::DevSts service;
  Ref<Tarvel::Ssl::SSLContext> context;
  const auto createContext = [&] {
    context = Tarvel::Ssl::CreateSSLContext();
    context->TrustFile(service.PathOf("authority.crt"));
  };
  const auto exchange = [&] { Exchange(*context, service.GetPort()); };
  createContext();
  for (int i = 0; i < 20; ++i) { // until each I/O thread has its thread-local data of OpenSSL
    ASSERT_EQ(OutcomeOf(exchange), "done");
  }
  ASSERT_TRUE(Testing::DrainIoThreads());
  context.reset();
  const long before = Testing::CountForeignAllocations();
  createContext();
  ::ExpectNothingElse(exchange);
  ASSERT_TRUE(Testing::DrainIoThreads());
  context.reset(); // and the sessions that it keeps
  EXPECT_LE(Testing::CountForeignAllocations() - before, 64);
}

} // namespace
