// SPDX-License-Identifier: Apache-2.0
// Whichever allocation of C++ fails while a document is read, or a token is verified or explained: the call either has the
// same result as with enough memory or throws `std::bad_alloc`.
#include "integration/out_of_memory/failing_heap.h"
#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/report_texts.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <new>
#include <stdexcept>
#include <string>

namespace {

using Testing::FailingHeap;
using Testing::ReadDataFile;
using Testing::Shortage;

const std::string NO_MEMORY = "std::bad_alloc";

/// "done", or the exception's message.
std::string OutcomeOf(const std::function<void()> &operation, FailingHeap &heap) {
  try {
    operation();
    heap.End();
    return "done";
  } catch (const std::bad_alloc &) {
    heap.End();
    return NO_MEMORY;
  } catch (const std::exception &failure) {
    heap.End();
    return failure.what();
  }
}

/// Runs the operation with each allocation failing in turn, until none is left to fail. Counts the outcomes.
std::map<std::string, int> Sweep(const std::function<void()> &operation, Shortage shortage) {
  std::map<std::string, int> outcomes;
  for (long allocations = 0;; ++allocations) {
    FailingHeap heap(allocations, shortage);
    const std::string outcome = OutcomeOf(operation, heap);
    ++outcomes[outcome];
    if (!heap.HasFailed()) {
      return outcomes;
    }
  }
}

/// `full` is the outcome with enough memory.
void ExpectNothingElse(const std::function<void()> &operation, const std::string &full) {
  FailingHeap none(1'000'000, Shortage::ONCE);
  ASSERT_EQ(OutcomeOf(operation, none), full); // makes what is made once per process
  for (const Shortage shortage : {Shortage::ONCE, Shortage::FROM_THEN}) {
    SCOPED_TRACE(shortage == Shortage::ONCE ? "once" : "from then on");
    const long before = Testing::CountHeapAllocations();
    std::map<std::string, int> outcomes = Sweep(operation, shortage);
    EXPECT_GE(outcomes[full], 1);
    EXPECT_GE(outcomes[NO_MEMORY], 5);
    outcomes.erase(full);
    outcomes.erase(NO_MEMORY);
    EXPECT_EQ(outcomes, (std::map<std::string, int>{}));
    EXPECT_EQ(Testing::CountHeapAllocations(), before);
  }
}

std::function<void()> Parse(const std::string &xml) {
  return [xml] {
    const auto reader = Tarvel::CreateStringReader(xml);
    Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*reader);
  };
}

/// Many of everything that the parser keeps lists of, so that it often allocates memory for them.
std::string DocumentOfMany() {
  std::string xml;
  for (int depth = 0; depth < 100; ++depth) {
    const std::string number = std::to_string(depth);
    xml += "<n" + number + " xmlns:p" + number + "='urn:" + number + "'";
    for (int attribute = 0; attribute < 30; ++attribute) {
      xml += " a" + std::to_string(attribute) + "='&lt;'";
    }
    xml += ">text &amp; text<![CDATA[ and text]]>";
  }
  for (int depth = 99; depth >= 0; --depth) {
    xml += "</n" + std::to_string(depth) + ">";
  }
  return xml;
}

TEST(OutOfHeap, IsReportedByTheParser) {
  ExpectNothingElse(Parse(ReadDataFile("tokens/full.xml")), "done");
  ExpectNothingElse(Parse(DocumentOfMany()), "done");
}

TEST(OutOfHeap, IsNotReportedAsAFaultOfTheDocument) {
  const std::string xml = DocumentOfMany();
  ExpectNothingElse(Parse(xml + "x"), "something other than comments and processing instructions follows the document "
                                      "element at line 1, column " +
                                          std::to_string(xml.size() + 1));
}

std::function<void()> Verification(const std::string &xml, const std::string &certificate) {
  const auto trusted = Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/" + certificate + ".crt"));
  return [xml, trusted] { SsoClient::CreateSamlToken(xml, trusted); };
}

TEST(OutOfHeap, NeverCausesAGenuineTokenToBeRefused) {
  ExpectNothingElse(Verification(ReadDataFile("tokens/full.xml"), "sts-rsa"), "done");
  ExpectNothingElse(Verification(ReadDataFile("tokens/holder-of-key.xml"), "sts-rsa"), "done");
}

TEST(OutOfHeap, NeverCausesATamperedTokenToBeAccepted) {
  std::string xml = ReadDataFile("tokens/bearer.xml");
  xml.replace(xml.find("alice"), 5, "malory");
  ExpectNothingElse(Verification(xml, "sts-rsa"), "Failed to verify signature: token might have been tampered with.");
}

/// The verifier trusts two keys and demands an audience that the tokens do not have.
SsoClient::TokenVerifier DemandingVerifier() {
  SsoClient::VerifyOptions options;
  options.acceptedAudiences = {"https://a-name-that-is-too-long-for-the-string-itself.example/"};
  Tarvel::Crypto::CertificateList trusted;
  for (const char *const name : {"tokens/other.crt", "tokens/sts-rsa.crt"}) {
    trusted.push_back(Tarvel::Crypto::LoadCertificates(Testing::DataPath(name)).front());
  }
  return SsoClient::TokenVerifier(trusted, options);
}

TEST(OutOfHeap, IsReportedByAVerifier) {
  const std::string xml = ReadDataFile("tokens/full.xml");
  const SsoClient::TokenVerifier verifier = DemandingVerifier();
  ExpectNothingElse(
      [&] { verifier.Verify(xml); },
      "The token is restricted to other audiences: https://files.corp.example/, https://mail.corp.example/");
}

TEST(OutOfHeap, IsReportedWhenAVerifierIsMade) {
  ExpectNothingElse([] { DemandingVerifier(); }, "done");
}

/// Explains `xml`, and fails if an incomplete report is returned.
void ExpectWholeReportOrNoMemory(const std::string &xml) {
  const Testing::FixedEnvironment clock;
  const SsoClient::TokenVerifier verifier = DemandingVerifier();
  const std::string whole = Testing::DescribeReport(verifier.Explain(xml));
  ExpectNothingElse(
      [&] {
        const SsoClient::TokenReport report = verifier.Explain(xml);
        FailingHeap enough(1'000'000, Shortage::ONCE); // for the comparison
        if (Testing::DescribeReport(report) != whole) {
          throw std::logic_error("another report");
        }
      },
      "done");
}

TEST(OutOfHeap, NeverLosesPartOfAReport) {
  ExpectWholeReportOrNoMemory(ReadDataFile("tokens/full.xml"));
  ExpectWholeReportOrNoMemory(ReadDataFile("attacks/namespace-conditions-rebound.xml"));
  ExpectWholeReportOrNoMemory(ReadDataFile("attacks/foreign-key-both-certificates.xml"));
  ExpectWholeReportOrNoMemory(ReadDataFile("attacks/entity-undefined.xml"));
}

/// The outcome is the report as text.
std::function<void()> Report(const std::string &xml) {
  const SsoClient::TokenVerifier verifier(Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt")));
  return [xml, verifier] { throw std::runtime_error(WriteTokenReport(verifier.Explain(xml))); };
}

TEST(OutOfHeap, NeverChangesAReport) {
  const Testing::FixedEnvironment clock;
  for (const std::string name :
       {"tokens/full.xml", "tokens/expired.xml", "attacks/unsigned.xml", "attacks/not-xml.xml"}) {
    SCOPED_TRACE(name);
    const auto report = Report(ReadDataFile(name));
    FailingHeap none(1'000'000, Shortage::ONCE);
    const std::string full = OutcomeOf(report, none);
    ASSERT_EQ("The token is ", full.substr(0, 13));
    ExpectNothingElse(report, full);
  }
}

} // namespace
