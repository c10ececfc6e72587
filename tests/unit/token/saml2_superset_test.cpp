// SPDX-License-Identifier: Apache-2.0

#include "support/data_file.h"
#include "token/assertion_parser.h"
#include "token/saml2_parser.h"
#include "unit/token/saml2_assertion.h"

#include <ssoclient/exceptions.h>
#include <tarvel/crypto/subject_public_key.h>

#include <gtest/gtest.h>

#include <filesystem>
#include <set>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

/// What both profiles read in one document.
struct BothProfiles {
  explicit BothProfiles(const std::string &text) : document(text) {
    NodeFilterIterator first = document.Cursor();
    ParseSamlAssertionElement(first, strict);
    NodeFilterIterator second = document.Cursor();
    ParseSaml2AssertionElement(second, saml2);
  }

  ParsedDocument document;
  SamlAssertionType strict;
  Saml2Assertion saml2;
};

void ExpectSameName(const NameIDType &strict, const NameIDType &saml2, const NameId &exact) {
  EXPECT_EQ(strict, saml2);
  EXPECT_EQ(strict.element, saml2.element);
  EXPECT_EQ((NameId{strict.value, strict.Format, {}, {}, {}}), exact);
}

template <typename Restriction>
void ExpectSameCount(const boost::optional<Restriction> &strict, const boost::optional<Restriction> &saml2) {
  ASSERT_EQ(strict.has_value(), saml2.has_value());
  EXPECT_TRUE(!strict || strict->Count == saml2->Count);
}

void ExpectSameDelegates(const ConditionsType &strict, const ConditionsType &saml2) {
  ASSERT_EQ(strict.DelegationRestriction.has_value(), saml2.DelegationRestriction.has_value());
  if (strict.DelegationRestriction) {
    const std::vector<DelegateType> &expected = strict.DelegationRestriction->delegates;
    const std::vector<DelegateType> &found = saml2.DelegationRestriction->delegates;
    ASSERT_EQ(expected.size(), found.size());
    for (std::size_t i = 0; i < expected.size(); ++i) {
      EXPECT_EQ(expected[i].DelegationInstant, found[i].DelegationInstant);
      EXPECT_EQ(expected[i].NameID, found[i].NameID);
      EXPECT_EQ(expected[i].NameID.element, found[i].NameID.element);
    }
  }
}

void ExpectSameConditions(const ConditionsType &strict, const Saml2Assertion &saml2) {
  const ConditionsType &found = saml2.common.Conditions;
  EXPECT_EQ(strict.NotBefore, found.NotBefore);
  EXPECT_EQ(strict.NotOnOrAfter, found.NotOnOrAfter);
  EXPECT_EQ(strict.element, found.element);
  ExpectSameCount(strict.RenewRestriction, found.RenewRestriction);
  ExpectSameCount(strict.ProxyRestriction, found.ProxyRestriction);
  ExpectSameDelegates(strict, found);
  std::vector<std::set<std::string>> audiences;
  if (strict.AudienceRestriction) {
    audiences.push_back(strict.AudienceRestriction->audiences);
  }
  EXPECT_EQ(audiences, saml2.details.audienceRestrictions);
}

void ExpectSameAttributes(const SamlAssertionType &strict, const SamlAssertionType &saml2) {
  ASSERT_EQ(strict.AttributeStatement.has_value(), saml2.AttributeStatement.has_value());
  if (strict.AttributeStatement) {
    const std::vector<AttributeType> &expected = strict.AttributeStatement->attributes;
    const std::vector<AttributeType> &found = saml2.AttributeStatement->attributes;
    ASSERT_EQ(expected.size(), found.size());
    for (std::size_t i = 0; i < expected.size(); ++i) {
      EXPECT_EQ(expected[i].Name, found[i].Name);
      EXPECT_EQ(expected[i].NameFormat, found[i].NameFormat);
      EXPECT_EQ(expected[i].FriendlyName, found[i].FriendlyName);
      EXPECT_EQ(expected[i].values, found[i].values);
      EXPECT_EQ(expected[i].element, found[i].element);
    }
  }
}

void ExpectSameAdvice(const SamlAssertionType &strict, const SamlAssertionType &saml2) {
  ASSERT_EQ(strict.Advice.has_value(), saml2.Advice.has_value());
  if (strict.Advice) {
    ASSERT_EQ(strict.Advice->advice.size(), saml2.Advice->advice.size());
    for (std::size_t i = 0; i < strict.Advice->advice.size(); ++i) {
      EXPECT_EQ(strict.Advice->advice[i].source, saml2.Advice->advice[i].source);
      EXPECT_EQ(strict.Advice->advice[i].attributes.size(), saml2.Advice->advice[i].attributes.size());
    }
  }
}

void ExpectSameConfirmation(const SubjectConfirmationType &strict, const Saml2Assertion &saml2) {
  ASSERT_EQ(1u, saml2.confirmations.size());
  ASSERT_EQ(1u, saml2.details.confirmations.size());
  const Saml2Confirmation &found = saml2.confirmations[0];
  const ConfirmationDetails &details = saml2.details.confirmations[0];
  EXPECT_EQ(strict.Method, found.type.value());
  EXPECT_EQ(strict.element, found.element);
  EXPECT_EQ(strict.SubjectConfirmationData.element, found.data);
  EXPECT_EQ(strict.writtenMethod.value(), details.method);
  EXPECT_EQ(strict.NameID ? strict.NameID->element : nullptr, found.nameId);
  EXPECT_EQ(strict.NameID.has_value(), details.nameId.has_value());
  if (strict.Method == SamlToken::BEARER) {
    EXPECT_EQ(strict.SubjectConfirmationData.NotOnOrAfter, details.notOnOrAfter.value());
    EXPECT_TRUE(details.publicKey.empty());
  } else {
    ASSERT_TRUE(details.certificate);
    EXPECT_EQ(strict.SubjectConfirmationData.certificate->GetDer(), details.certificate->GetDer());
    EXPECT_EQ(Tarvel::Crypto::GetSubjectPublicKey(*details.certificate), details.publicKey);
  }
}

void ExpectSameRecord(const std::string &text) {
  const BothProfiles both(text);
  const SamlAssertionType &strict = both.strict;
  const SamlAssertionType &common = both.saml2.common;
  EXPECT_EQ(strict.Version, common.Version);
  EXPECT_EQ(strict.ID, common.ID);
  EXPECT_EQ(strict.IssueInstant, common.IssueInstant);
  EXPECT_EQ(strict.element, common.element);
  EXPECT_TRUE(common.Signature);
  ExpectSameName(strict.Issuer, common.Issuer, both.saml2.details.issuer);
  ExpectSameName(strict.Subject.NameID, common.Subject.NameID, both.saml2.details.subject);
  ExpectSameConfirmation(strict.Subject.SubjectConfirmation, both.saml2);
  ExpectSameConditions(strict.Conditions, both.saml2);
  ExpectSameAdvice(strict, common);
  ExpectSameAttributes(strict, common);
  ASSERT_EQ(1u, both.saml2.details.authnStatements.size());
  EXPECT_EQ(strict.AuthnStatement.AuthnInstant, both.saml2.details.authnStatements[0].authnInstant);
  EXPECT_EQ(strict.AuthnStatement.AuthnContext.AuthnContextClassRef,
            both.saml2.details.authnStatements[0].contextClass.value());
}

TEST(ProfileSaml2, ReadsTheSameAsTheStrictProfileInEveryToken) {
  std::size_t tokens = 0;
  for (const auto &file : std::filesystem::directory_iterator(DataPath("tokens"))) {
    if (file.path().extension() == ".xml") {
      SCOPED_TRACE(file.path().filename());
      ExpectSameRecord(ReadDataFile("tokens/" + file.path().filename().string()));
      ++tokens;
    }
  }
  EXPECT_LE(35u, tokens);
}

TEST(ProfileSaml2, ReadsTheSameAsTheStrictProfileInAssertionsWithAndWithoutOptionalParts) {
  ExpectSameRecord(BearerAssertion());
  ExpectSameRecord(HolderOfKeyAssertion());
}

} // namespace
