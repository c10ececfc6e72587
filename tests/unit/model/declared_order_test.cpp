// SPDX-License-Identifier: Apache-2.0
// The declared order of virtual functions and of fields, on which compiled callers and braced initialisers rely.
#include "support/declared_order.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/negotiation_handler.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/token_spec.h>

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using namespace SsoClient;
using Testing::AreInOrder;
using Testing::SlotOf;

/// `Class` with one more virtual function. Its slot is the number of virtual functions of `Class`.
template <typename Class>
class WithOneMore : public Class {
public:
  virtual void OneMore() {}

protected:
  ~WithOneMore() = default;
};

/// The type of the overload that sets a `Value`, which is the virtual one.
template <typename Value>
using Sets = void (SamlToken::*)(Value &) const;

TEST(DeclaredOrder, SlotsOfSamlToken) {
  const std::vector<std::size_t> slots{SlotOf(&SamlToken::GetId),
                                       SlotOf(&SamlToken::GetStartDate),
                                       SlotOf(&SamlToken::GetEndDate),
                                       SlotOf(&SamlToken::GetSubject),
                                       SlotOf(&SamlToken::IsRenewable),
                                       SlotOf(&SamlToken::IsDelegable),
                                       SlotOf(&SamlToken::IsSolution),
                                       SlotOf(&SamlToken::GetConfirmationMethod),
                                       SlotOf<Sets<std::pair<std::string, std::string>>>(&SamlToken::GetFullName),
                                       SlotOf<Sets<std::vector<PrincipalId>>>(&SamlToken::GetGroups),
                                       SlotOf<Sets<std::vector<Delegate>>>(&SamlToken::GetDelegationChain),
                                       SlotOf<Sets<std::set<std::string>>>(&SamlToken::GetAudience),
                                       SlotOf<Sets<std::vector<Advice>>>(&SamlToken::GetAdvice),
                                       SlotOf(&SamlToken::GetConfirmationCertificate),
                                       SlotOf(&SamlToken::ToXml),
                                       SlotOf(&WithOneMore<SamlToken>::OneMore)};
  EXPECT_EQ((std::vector<std::size_t>{0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15}), slots);
}

TEST(DeclaredOrder, SlotOfNegotiationHandler) {
  EXPECT_EQ(0u, SlotOf(&NegotiationHandler::NegotiateLeg));
  EXPECT_EQ(1u, SlotOf(&WithOneMore<NegotiationHandler>::OneMore));
}

template <typename Exception>
class SlotsOfException : public ::testing::Test {};

using AllExceptions = ::testing::Types<SsoException, InvalidTokenException, InvalidSignatureException, ParseException,
                                       CommunicationException, InvalidCredentialsException>;
TYPED_TEST_SUITE(SlotsOfException, AllExceptions);

TYPED_TEST(SlotsOfException, AreThoseOfThePlatformsClass) {
  class WithOneMoreSlot : public TypeParam {
  public:
    virtual void OneMore() {}
  };
  // The first two are those of the destructor.
  const std::vector<std::size_t> slots{SlotOf(&TypeParam::what),         SlotOf(&TypeParam::GetBacktrace),
                                       SlotOf(&TypeParam::Dump),         SlotOf(&TypeParam::Where),
                                       SlotOf(&TypeParam::Clone),        SlotOf(&TypeParam::Throw),
                                       SlotOf(&WithOneMoreSlot::OneMore)};
  EXPECT_EQ((std::vector<std::size_t>{2, 3, 4, 5, 6, 7, 8}), slots);
}

// Each class inherits the first four from the platform's class, and overrides the last two.
template <typename Exception>
constexpr bool OVERRIDES_ONLY_CLONE_AND_THROW =
    std::is_same_v<decltype(&Exception::what), decltype(&Tarvel::Exception::what)>
        &&std::is_same_v<decltype(&Exception::GetBacktrace), decltype(&Tarvel::Exception::GetBacktrace)>
            &&std::is_same_v<decltype(&Exception::Dump), decltype(&Tarvel::Exception::Dump)>
                &&std::is_same_v<decltype(&Exception::Where), decltype(&Tarvel::Exception::Where)>
                    &&std::is_same_v<decltype(&Exception::Clone), Exception *(Exception::*)() const>
                        &&std::is_same_v<decltype(&Exception::Throw), void (Exception::*)() const>;
static_assert(OVERRIDES_ONLY_CLONE_AND_THROW<SsoException>);
static_assert(OVERRIDES_ONLY_CLONE_AND_THROW<InvalidTokenException>);
static_assert(OVERRIDES_ONLY_CLONE_AND_THROW<InvalidSignatureException>);
static_assert(OVERRIDES_ONLY_CLONE_AND_THROW<ParseException>);
static_assert(OVERRIDES_ONLY_CLONE_AND_THROW<CommunicationException>);
static_assert(OVERRIDES_ONLY_CLONE_AND_THROW<InvalidCredentialsException>);

// No class adds a field.
static_assert(sizeof(SsoException) == sizeof(Tarvel::Exception));
static_assert(sizeof(InvalidTokenException) == sizeof(Tarvel::Exception));
static_assert(sizeof(InvalidSignatureException) == sizeof(Tarvel::Exception));
static_assert(sizeof(ParseException) == sizeof(Tarvel::Exception));
static_assert(sizeof(CommunicationException) == sizeof(Tarvel::Exception));
static_assert(sizeof(InvalidCredentialsException) == sizeof(Tarvel::Exception));

static_assert(std::is_aggregate_v<SecurityTokenServiceConfig>);

TEST(DeclaredOrder, FieldsOfTokenSpec) {
  const TokenSpec spec;
  EXPECT_TRUE(AreInOrder(spec, spec.tokenLifetimeSec, spec.audienceRestriction, spec.advice, spec.delegable,
                         spec.delegateTo, spec.renewable, spec.confirmation));
}

TEST(DeclaredOrder, FieldsOfSecurityTokenServiceConfig) {
  const SecurityTokenServiceConfig config;
  EXPECT_TRUE(AreInOrder(config, config.stsUrl, config.signingCertificates, config.sslParameter,
                         config.holderOfKeyConfig, config.sslContext, config.useDomainControllerName));
}

TEST(DeclaredOrder, FieldsOfHolderOfKeyConfig) {
  const HolderOfKeyConfig config;
  EXPECT_TRUE(AreInOrder(config, config.privateKey, config.certificate));
}

TEST(DeclaredOrder, FieldsOfPrincipalId) {
  const PrincipalId principal;
  EXPECT_TRUE(AreInOrder(principal, principal.name, principal.domain));
}

TEST(DeclaredOrder, FieldsOfDelegate) {
  const Delegate delegate;
  EXPECT_TRUE(AreInOrder(delegate, delegate.subject, delegate.delegationInstant));
}

TEST(DeclaredOrder, FieldsOfAdvice) {
  const Advice advice;
  EXPECT_TRUE(AreInOrder(advice, advice.source, advice.attributes));
  const AdviceAttribute attribute;
  EXPECT_TRUE(AreInOrder(attribute, attribute.name, attribute.values));
}

} // namespace
