// SPDX-License-Identifier: Apache-2.0
// The profile SAML2 reads all that the profile STRICT reads, with the same facts.

#include "details_text.h"
#include "outcome_text.h"

#include "integration/signed_requests/foreign_document.h"
#include "integration/token_report/token_changes.h"
#include "support/data_file.h"
#include "support/facts_of.h"
#include "support/fixed_environment.h"
#include "support/judged_token.h"
#include "support/repetitions.h"
#include "support/sanitized.h"

#include <libxml/xmlerror.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

namespace Testing {
namespace {

using namespace SsoClient;

Tarvel::Crypto::CertificateList Trusted() {
  Tarvel::Crypto::CertificateList trusted;
  for (const char *const name : {"sts-rsa", "sts-rsa3072", "sts-ec256", "sts-ec384", "sts-ec521"}) {
    trusted.push_back(Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/" + std::string(name) + ".crt")));
  }
  return trusted;
}

std::vector<std::string> FilesIn(const std::string &folder) {
  std::vector<std::string> files;
  for (const auto &entry : std::filesystem::directory_iterator(DataPath(folder))) {
    if (entry.path().extension() == ".xml") {
      files.push_back(folder + "/" + entry.path().filename().string());
    }
  }
  std::sort(files.begin(), files.end());
  return files;
}

/// A verifier of each profile, with the same other options.
struct Verifiers {
  explicit Verifiers(const VerifyOptions &options) : strict(Trusted(), options), saml2(Trusted(), WithSaml2(options)) {}

  static VerifyOptions WithSaml2(VerifyOptions options) {
    options.profile = TokenProfile::SAML2;
    return options;
  }

  JudgedVerifier strict;
  JudgedVerifier saml2;
};

std::vector<Verifiers> AllVerifiers() {
  std::vector<VerifyOptions> choices(6);
  choices[1].clockToleranceSec = -3'155'760'000;
  choices[2].acceptedAudiences = {"https://files.corp.example/"};
  choices[3].acceptedAudiences = {"https://files.corp.example/", "https://elsewhere.example/"};
  choices[3].acceptUnrestrictedAudience = false;
  choices[4].requiredConfirmation = SamlToken::BEARER;
  choices[5].requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  std::vector<Verifiers> verifiers;
  for (const VerifyOptions &options : choices) {
    verifiers.emplace_back(options);
  }
  return verifiers;
}

/// What is wrong with the outcomes for `xml`; empty if the profiles agree as they must. Sets `isAccepted` to whether
/// STRICT accepts it.
std::string FindContradictions(const Verifiers &verifiers, const std::string &xml, bool &isAccepted) {
  const Judgement strict = JudgeText(verifiers.strict, xml);
  const Judgement saml2 = JudgeText(verifiers.saml2, xml);
  const std::shared_ptr<const SamlToken> &narrow = strict.verification.token;
  const std::shared_ptr<const SamlToken> &wide = saml2.verification.token;
  isAccepted = narrow != nullptr;
  std::string wrong = strict.contradictions + saml2.contradictions;
  if (narrow && !wide) {
    return wrong + "only STRICT accepts it; SAML2: " + saml2.verification.refusal + '\n';
  }
  if (narrow && FactsOf(*narrow) != FactsOf(*wide)) {
    wrong += "other facts:\n" + FactsOf(*narrow) + "SAML2:\n" + FactsOf(*wide);
  }
  if (narrow && DescribeDetails(*narrow) != DescribeDetails(*wide)) {
    wrong += "other details:\n" + DescribeDetails(*narrow) + "SAML2:\n" + DescribeDetails(*wide);
  }
  if (strict.verification.exceptionClass == "XMLParseException" &&
      strict.verification.refusal != saml2.verification.refusal) {
    wrong += "another refusal of what is not well-formed\n";
  }
  return wrong;
}

class BothProfiles : public testing::Test {
protected:
  /// Tries each file with each of the verifiers. Returns how often STRICT accepted.
  int JudgeFiles(const std::string &folder) {
    int accepted = 0;
    for (const std::string &file : FilesIn(folder)) {
      for (const Verifiers &verifiers : m_verifiers) {
        bool isAccepted = false;
        EXPECT_EQ("", FindContradictions(verifiers, ReadDataFile(file), isAccepted)) << file;
        accepted += isAccepted ? 1 : 0;
      }
    }
    return accepted;
  }

  const std::vector<Verifiers> m_verifiers = AllVerifiers();

private:
  const FixedEnvironment m_clock;
};

TEST_F(BothProfiles, AgreeOnTokens) {
  EXPECT_GT(JudgeFiles("tokens"), 130);
}

TEST_F(BothProfiles, AgreeOnAttacks) {
  EXPECT_GT(JudgeFiles("attacks"), 10);
}

TEST_F(BothProfiles, AgreeOnTheTokensOfOtherTools) {
  EXPECT_EQ(0, JudgeFiles("saml2"));
}

void IgnoreError(void *, const char *, ...) {}

/// Signs the token again. Returns an empty text if it has lost its signature, or xmlsec1 cannot sign it.
std::string SignedIfPossible(std::string xml) {
  static const std::string key = ReadDataFile("tokens/sts-rsa.key");
  for (const std::string element : {"ds:DigestValue", "ds:SignatureValue"}) {
    const std::size_t begin = xml.find("<" + element + ">");
    const std::size_t end = xml.find("</" + element, begin);
    if (begin == std::string::npos || end == std::string::npos) {
      return "";
    }
    xml.erase(begin + element.size() + 2, end - begin - element.size() - 2);
  }
  try {
    return SignTemplate(xml, key);
  } catch (const std::runtime_error &) {
    return "";
  }
}

/// Unlike a change to a signed token, these changes reach every rule about the content.
TEST_F(BothProfiles, AgreeOnTokensThatAreSignedAfterAChange) {
  const std::size_t changes = IS_SANITIZED ? 20 : Repetitions<std::size_t>(5000, 150);
  RandomSource random(2026);
  xmlSetGenericErrorFunc(nullptr, IgnoreError); // otherwise libxml2 prints why xmlsec1 cannot sign a text
  std::size_t strictlyAccepted = 0;
  std::size_t tried = 0;
  std::vector<std::string> files;
  for (const char *const name : {"bearer", "full", "delegated", "holder-of-key", "bearer-minimal"}) {
    files.push_back(ReadDataFile("tokens/" + std::string(name) + ".xml"));
  }
  for (const char *const name : {"wss4j-conditions", "authn-everything", "form-attribute-values", "holder-rsa-value",
                                 "confirmations-holder-and-bearer", "delegation-confirmed"}) {
    files.push_back(ReadDataFile("saml2/" + std::string(name) + ".xml"));
  }
  for (const std::string &file : files) {
    for (std::size_t change = 0; change < changes; ++change) {
      const std::string xml = SignedIfPossible(Reports::ChangeToken(file, files[random.Below(files.size())], random));
      if (xml.empty()) {
        continue;
      }
      bool isAccepted = false;
      const Verifiers &verifiers = m_verifiers[random.OnceIn(3) ? random.Below(m_verifiers.size()) : 0];
      ASSERT_EQ("", FindContradictions(verifiers, xml, isAccepted)) << xml;
      strictlyAccepted += isAccepted ? 1u : 0u;
      ++tried;
    }
  }
  EXPECT_GT(tried, changes);
  EXPECT_GT(strictlyAccepted, changes / 10);
}

} // namespace
} // namespace Testing
