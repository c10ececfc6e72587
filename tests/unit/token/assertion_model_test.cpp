// SPDX-License-Identifier: Apache-2.0
// The records of an assertion are aggregates. Their fields have a fixed order, on which braced initialisers rely.
#include "token/assertion_model.h"

#include "support/declared_order.h"

#include <gtest/gtest.h>

#include <type_traits>

namespace {

using namespace SsoClient;
using Testing::AreInOrder;

template <typename... Records>
constexpr bool ARE_AGGREGATES = (std::is_aggregate_v<Records> && ...);
static_assert(ARE_AGGREGATES<NameIDType, SubjectConfirmationDataType, SubjectConfirmationType, SubjectType,
                             RenewRestrictionType, ProxyRestrictionType, DelegateType, DelegationRestrictionType,
                             AudienceRestrictionType, ConditionsType, AdviceType, AuthnContextType, AuthnStatementType,
                             AttributeType, AttributeStatementType, SamlAssertionType>);

TEST(AssertionModel, DeclaresTheFieldsOfTheAssertionInOrder) {
  const SamlAssertionType all;
  EXPECT_TRUE(AreInOrder(all, all.Version, all.ID, all.IssueInstant, all.Issuer, all.Signature, all.Subject,
                         all.Conditions, all.Advice, all.AuthnStatement, all.AttributeStatement));
}

TEST(AssertionModel, DeclaresTheFieldsOfTheSubjectInOrder) {
  const SubjectType subject;
  EXPECT_TRUE(AreInOrder(subject, subject.NameID, subject.SubjectConfirmation));
  EXPECT_TRUE(AreInOrder(subject.NameID, subject.NameID.Format, subject.NameID.value));
  const SubjectConfirmationType &confirmation = subject.SubjectConfirmation;
  EXPECT_TRUE(AreInOrder(confirmation, confirmation.Method, confirmation.NameID, confirmation.SubjectConfirmationData));
  const SubjectConfirmationDataType &data = confirmation.SubjectConfirmationData;
  EXPECT_TRUE(AreInOrder(data, data.NotOnOrAfter, data.certificate));
}

TEST(AssertionModel, DeclaresTheFieldsOfTheConditionsInOrder) {
  const ConditionsType conditions;
  EXPECT_TRUE(AreInOrder(conditions, conditions.NotBefore, conditions.NotOnOrAfter, conditions.RenewRestriction,
                         conditions.DelegationRestriction, conditions.AudienceRestriction,
                         conditions.ProxyRestriction));
  const DelegateType delegate;
  EXPECT_TRUE(AreInOrder(delegate, delegate.DelegationInstant, delegate.NameID));
}

TEST(AssertionModel, DeclaresTheFieldsOfTheStatementsInOrder) {
  const AuthnStatementType statement;
  EXPECT_TRUE(AreInOrder(statement, statement.AuthnInstant, statement.AuthnContext));
  const AttributeType attribute;
  EXPECT_TRUE(AreInOrder(attribute, attribute.Name, attribute.NameFormat, attribute.FriendlyName, attribute.values));
}

} // namespace
