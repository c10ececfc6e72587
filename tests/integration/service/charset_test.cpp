// SPDX-License-Identifier: Apache-2.0
// A service that reads requests as ISO-8859-1, because they state no charset, and answers in it: every operation still
// works with texts beyond ASCII, and beyond ISO-8859-1.
#include "integration/service/service_client.h"
#include "support/throws_message.h"
#include "support/work_folder.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace SsoClient {
namespace {

using namespace Testing;
using TokenPtr = std::shared_ptr<const SamlToken>;

const char USER[] = "jürgen-ł-語-😀@grün.example";
const char USER_PASSWORD[] = "pässword ł 語 😀";
const char USERS[] =
    R"([{"name":"jürgen-ł-語-😀@grün.example","password":"pässword ł 語 😀","first":"Jürgen ł","last":"語 😀",
                          "groups":["größe-ł@grün.example","語-😀@grün.example"]}])";

/// A service that uses `charset` and has `USER` as its only user.
class ServiceIn {
public:
  explicit ServiceIn(const std::string &charset)
      : m_service({"--charset", charset, "--users", m_folder.Write("users.json", USERS)}) {}
  const std::string &GetUrl() const { return m_service.GetUrl(); }

private:
  const WorkFolder m_folder;
  const DevSts m_service;
};

TokenSpec Spec() {
  TokenSpec spec = SpecFor(3600);
  spec.audienceRestriction = {"https://grün.example/ł-語-😀"};
  spec.advice = {{"https://advice.example/ü-ł", {{"größe-語", {"rød", "😀"}}}}};
  spec.renewable = true;
  spec.delegable = true;
  return spec;
}

ExpectedFields Fields(const std::string &confirmation) {
  ExpectedFields fields;
  fields.subject = USER;
  fields.confirmation = confirmation;
  fields.renewable = true;
  fields.delegable = true;
  fields.fullName = "Jürgen ł 語 😀";
  fields.groups = {"größe-ł@grün.example", "語-😀@grün.example"};
  fields.audience = {"https://grün.example/ł-語-😀"};
  fields.advice = "https://advice.example/ü-ł{größe-語=rød,😀}";
  return fields;
}

class ServiceInLatin1 : public testing::Test {
protected:
  const std::int64_t m_begin = NowInMilliseconds();
  const ServiceIn m_service{"ISO-8859-1"};
  const ServiceClient m_plain{"", m_service.GetUrl()};
  const ServiceClient m_client{"client", m_service.GetUrl()};
};

TEST_F(ServiceInLatin1, AcquiresTokensByPassword) {
  EXPECT_EQ(Compare(m_plain->AcquireToken(USER, USER_PASSWORD, Spec()), Fields("bearer"), m_begin), "");
  EXPECT_EQ(Compare(m_client->AcquireToken(USER, USER_PASSWORD, Spec()), Fields("client"), m_begin), "");
}

TEST_F(ServiceInLatin1, RefusesAnotherPassword) {
  EXPECT_THROW(m_plain->AcquireToken(USER, "pässword ł 語 ☺", Spec()), InvalidCredentialsException);
}

TEST_F(ServiceInLatin1, AcquiresATokenByCertificate) {
  ExpectedFields expected = FieldsOfCertificate("client");
  const ExpectedFields asked = Fields("client");
  expected.renewable = expected.delegable = true;
  expected.audience = asked.audience;
  expected.advice = asked.advice;
  EXPECT_EQ(Compare(m_client->AcquireTokenByCertificate(Spec()), expected, m_begin), "");
}

TEST_F(ServiceInLatin1, ExchangesRenewsAndValidatesATokenBeyondAscii) {
  const TokenPtr held = m_client->AcquireToken(USER, USER_PASSWORD, Spec());
  EXPECT_EQ(Compare(m_client->AcquireTokenByToken(*held, Spec()), Fields("client"), m_begin), "");
  EXPECT_EQ(Compare(m_client->RenewToken(*held, 3600), Fields("client"), m_begin), "");
  EXPECT_TRUE(m_client->ValidateSubject(*held));
}

TEST_F(ServiceInLatin1, DelegatesToANameBeyondAscii) {
  TokenSpec spec = Spec();
  spec.delegateTo = std::string("zoë-ł-語-😀@grün.example");
  const TokenPtr held = m_client->AcquireToken(USER, USER_PASSWORD, Spec());
  ExpectedFields expected = Fields("client");
  expected.delegation = {*spec.delegateTo};
  EXPECT_EQ(Compare(m_client->AcquireTokenByToken(*held, spec), expected, m_begin), "");
}

TEST_F(ServiceInLatin1, AcceptsATokenOfAServiceInUtf8AndViceVersa) {
  const ServiceIn other("UTF-8");
  const ServiceClient otherClient("client", other.GetUrl());
  const TokenPtr fromOther = otherClient->AcquireToken(USER, USER_PASSWORD, Spec());
  EXPECT_TRUE(m_client->ValidateSubject(*fromOther));
  EXPECT_EQ(Compare(m_client->RenewToken(*fromOther, 3600), Fields("client"), m_begin), "");
  const TokenPtr held = m_client->AcquireToken(USER, USER_PASSWORD, Spec());
  EXPECT_TRUE(otherClient->ValidateSubject(*held));
}

TEST(ServiceInWindows1252, IsRefusedWithTheNameOfItsCharset) {
  const ServiceIn service("windows-1252");
  const TokenPtr token = ServiceClient()->AcquireToken(ALICE, PASSWORD, SpecFor(3600));
  EXPECT_THROWS_MESSAGE(ServiceClient("", service.GetUrl())->ValidateSubject(*token), SsoException,
                        "Response is not well-formed XML: the encoding 'windows-1252' is declared, only UTF-8 is "
                        "accepted at line 1, column 31 (charset windows-1252)");
}

} // namespace
} // namespace SsoClient
