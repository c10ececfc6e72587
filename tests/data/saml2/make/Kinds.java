// SPDX-License-Identifier: Apache-2.0
// One token for each kind of assertion.

import java.util.*;
import org.apache.wss4j.common.saml.bean.*;
import org.opensaml.core.xml.XMLObject;
import org.opensaml.core.xml.schema.*;
import org.opensaml.core.xml.schema.impl.*;
import org.opensaml.saml.ext.saml2delrestrict.*;
import org.opensaml.saml.saml2.core.*;

final class Kinds extends MakeTokens {
  static final javax.xml.namespace.QName NIL =
      new javax.xml.namespace.QName("http://www.w3.org/2001/XMLSchema-instance", "nil", "xsi");

  static void all() throws Exception {
    wss4jTokens();
    names();
    confirmations();
    keys();
    conditions();
    statements();
    attributes();
    advice();
    delegation();
  }

  private static void wss4jTokens() throws Exception {
    wss4j("wss4j-bearer", BEARER, callback -> {});
    wss4j("wss4j-holder-certificate", HOLDER, callback -> {
      KeyInfoBean key = new KeyInfoBean();
      key.setCertificate(certificate("holder"));
      key.setCertIdentifer(KeyInfoBean.CERT_IDENTIFIER.X509_CERT);
      callback.getSubject().setKeyInfo(key);
    });
    wss4j("wss4j-holder-key-value", HOLDER, callback -> {
      KeyInfoBean key = new KeyInfoBean();
      key.setPublicKey(certificate("holder").getPublicKey());
      key.setCertIdentifer(KeyInfoBean.CERT_IDENTIFIER.KEY_VALUE);
      callback.getSubject().setKeyInfo(key);
    });
    wss4j("wss4j-attributes", BEARER, callback -> {
      AttributeBean role = new AttributeBean("role", "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/role",
          List.of("auditor", "gr\u00fcn & \"gelb\" <1>"));
      role.setNameFormat("urn:oasis:names:tc:SAML:2.0:attrname-format:uri");
      AttributeStatementBean statement = new AttributeStatementBean();
      statement.setSamlAttributes(List.of(role));
      callback.setAttributeStatementData(List.of(statement));
      AuthenticationStatementBean authn = new AuthenticationStatementBean();
      authn.setAuthenticationInstant(time("2020-01-01T00:00:00.000Z"));
      authn.setAuthenticationMethod("urn:oasis:names:tc:SAML:2.0:ac:classes:Password");
      authn.setSessionIndex("42");
      SubjectLocalityBean locality = new SubjectLocalityBean();
      locality.setIpAddress("192.0.2.7");
      locality.setDnsAddress("pc7.partner.example");
      authn.setSubjectLocality(locality);
      callback.setAuthenticationStatementData(List.of(authn));
    });
    wss4j("wss4j-conditions", BEARER, callback -> {
      ConditionsBean conditions = callback.getConditions();
      AudienceRestrictionBean first = new AudienceRestrictionBean(List.of("https://files.corp.example/"));
      AudienceRestrictionBean second =
          new AudienceRestrictionBean(List.of("https://mail.corp.example/", "https://files.corp.example/"));
      conditions.setAudienceRestrictions(List.of(first, second));
      conditions.setOneTimeUse(true);
      ProxyRestrictionBean proxy = new ProxyRestrictionBean();
      proxy.setCount(2);
      proxy.getAudienceURIs().addAll(List.of("https://partner.example/"));
      conditions.setProxyRestriction(proxy);
    });
    wss4j("wss4j-confirmation-data", BEARER, callback -> {
      SubjectConfirmationDataBean data = new SubjectConfirmationDataBean();
      data.setRecipient("https://files.corp.example/consume");
      data.setInResponseTo("_request-1");
      data.setAddress("192.0.2.7");
      data.setNotBefore(time("2020-02-01T00:00:00.000Z"));
      data.setNotAfter(time("2119-01-01T00:00:00.000Z"));
      callback.getSubject().setSubjectConfirmationData(data);
    });
  }

  private static void names() throws Exception {
    named("name-unspecified", nameId("alice", FORMATS + "unspecified", null, null, null));
    named("name-unspecified-with-at", nameId("alice@corp.example", null, null, null, null));
    named("name-email", nameId("alice@corp.example", FORMATS + "emailAddress", null, null, null));
    named("name-x509", nameId("CN=alice,OU=people,O=Example", FORMATS + "X509SubjectName", null, null, null));
    named("name-windows", nameId("CORP\\alice", FORMATS + "WindowsDomainQualifiedName", null, null, null));
    named("name-kerberos", nameId("alice/admin@CORP.EXAMPLE", FORMATS_2 + "kerberos", null, null, null));
    named("name-entity", nameId("https://alice.example/", FORMATS_2 + "entity", null, null, null));
    named("name-persistent", nameId("aB3/=", FORMATS_2 + "persistent", "https://idp.partner.example/sts",
        "https://files.corp.example/", "alice-at-files"));
    named("name-transient", nameId("_Ab", FORMATS_2 + "transient", null, null, null));
    named("name-upn", nameId("alice@corp.example", "http://schemas.xmlsoap.org/claims/UPN", null, null, null));
    named("name-upn-qualified",
        nameId("alice@corp.example", "http://schemas.xmlsoap.org/claims/UPN", "q;a=\u00fc", null, null));
    named("name-upn-without-at", nameId("alice", "http://schemas.xmlsoap.org/claims/UPN", null, null, null));
    named("name-other-format", nameId("alice", "urn:example:format;X", null, "S P", null));
    named("name-beyond-ascii", nameId("gr\u00fcn \"&<\ud83d\ude00", null, null, null, null));
    token("issuer-qualified", assertion -> {
      assertion.getIssuer().setFormat(FORMATS_2 + "entity");
      assertion.getIssuer().setNameQualifier("https://partner.example/");
      assertion.getIssuer().setSPNameQualifier("https://files.corp.example/");
      assertion.getIssuer().setSPProvidedID("partner");
    });
  }

  private static void confirmations() throws Exception {
    token("confirmation-all-data", assertion -> {
      SubjectConfirmationData data = data(confirm(assertion, BEARER));
      data.setRecipient("https://files.corp.example/consume");
      data.setInResponseTo("_request-1");
      data.setAddress("192.0.2.7");
      data.setNotBefore(time("2020-02-01T00:00:00.000Z"));
      data.setNotOnOrAfter(time("2119-01-01T00:00:00.000Z"));
    });
    token("confirmation-empty-data", assertion -> data(confirm(assertion, BEARER)));
    token("confirmation-unknown-data", assertion -> {
      SubjectConfirmationData data = data(confirm(assertion, BEARER));
      data.setRecipient("https://files.corp.example/consume");
      data.getUnknownXMLObjects().add(any("anything"));
    });
    token("confirmations-second-fits", assertion -> {
      data(confirm(assertion, BEARER)).setNotOnOrAfter(time("2021-01-01T00:00:00.000Z"));
      data(confirm(assertion, BEARER)).setNotOnOrAfter(time("2110-01-01T00:00:00.000Z"));
      data(confirm(assertion, BEARER)).setNotOnOrAfter(time("2115-01-01T00:00:00.000Z"));
    });
    token("confirmations-unknown-and-bearer", assertion -> {
      confirm(assertion, "urn:oasis:names:tc:SAML:2.0:cm:sender-vouches");
      confirm(assertion, "urn:example:method");
      confirm(assertion, BEARER);
    });
    token("confirmations-holder-and-bearer", assertion -> {
      holder(assertion, certificate("holder"), null, true);
      data(confirm(assertion, BEARER)).setNotOnOrAfter(time("2110-01-01T00:00:00.000Z"));
    });
    token("confirmations-late-bearer-and-holder", assertion -> {
      data(confirm(assertion, BEARER)).setNotBefore(time("2110-01-01T00:00:00.000Z"));
      holder(assertion, null, certificate("holder").getPublicKey(), false);
    });
    token("confirmation-named-like-the-subject", assertion -> {
      confirm(assertion, BEARER).setNameID(nameId("alice", null, null, null, null));
    });
  }

  private static void keys() throws Exception {
    token("holder-certificate", assertion -> holder(assertion, certificate("holder"), null, false));
    token("holder-certificate-typed", assertion -> holder(assertion, certificate("holder"), null, true));
    token("holder-rsa-value", assertion -> holder(assertion, null, certificate("holder").getPublicKey(), true));
    token("holder-ec-value", assertion -> holder(assertion, null, certificate("sts-ec256").getPublicKey(), true));
    token("holder-ec384-value", assertion -> holder(assertion, null, certificate("sts-ec384").getPublicKey(), true));
    token("holder-ec-certificate", assertion -> holder(assertion, certificate("sts-ec521"), null, true));
    token("holder-certificate-and-value",
        assertion -> holder(assertion, certificate("holder"), certificate("holder").getPublicKey(), true));
    token("holder-two-keys", assertion -> {
      holder(assertion, certificate("holder"), null, true);
      holder(assertion, null, certificate("sts-ec256").getPublicKey(), true);
    });
  }

  private static void conditions() throws Exception {
    token("conditions-no-not-before", assertion -> assertion.getConditions().setNotBefore(null));
    token("conditions-three-audience-restrictions", assertion -> {
      assertion.getConditions().getAudienceRestrictions().add(restrict("https://files.corp.example/", "urn:a"));
      assertion.getConditions().getAudienceRestrictions().add(restrict("urn:b", "https://files.corp.example/"));
      assertion.getConditions().getAudienceRestrictions().add(restrict("https://files.corp.example/", "urn:c"));
    });
    token("conditions-disjoint-audience-restrictions", assertion -> {
      assertion.getConditions().getAudienceRestrictions().add(restrict("urn:a"));
      assertion.getConditions().getAudienceRestrictions().add(restrict("urn:b"));
    });
    token("conditions-one-time-use",
        assertion -> assertion.getConditions().getConditions().add(make(OneTimeUse.DEFAULT_ELEMENT_NAME)));
    token("conditions-proxy", assertion -> {
      ProxyRestriction proxy = make(ProxyRestriction.DEFAULT_ELEMENT_NAME);
      proxy.setProxyCount(0);
      proxy.getAudiences().add(audience("https://partner.example/"));
      proxy.getAudiences().add(audience("https://another.example/"));
      assertion.getConditions().getConditions().add(proxy);
    });
    token("conditions-proxy-without-count", assertion ->
        assertion.getConditions().getConditions().add(make(ProxyRestriction.DEFAULT_ELEMENT_NAME)));
  }

  private static void statements() throws Exception {
    token("authn-everything", assertion -> {
      AuthnStatement statement = authn(assertion, AuthnContext.X509_AUTHN_CTX, "https://idp.partner.example/context");
      statement.setSessionIndex("a session");
      statement.setSessionNotOnOrAfter(time("2119-06-01T00:00:00.000Z"));
      SubjectLocality locality = make(SubjectLocality.DEFAULT_ELEMENT_NAME);
      locality.setAddress("2001:db8::7");
      locality.setDNSName("pc7.partner.example");
      statement.setSubjectLocality(locality);
      for (String uri : List.of("https://upstream.example/", "https://further.example/")) {
        AuthenticatingAuthority authority = make(AuthenticatingAuthority.DEFAULT_ELEMENT_NAME);
        authority.setURI(uri);
        statement.getAuthnContext().getAuthenticatingAuthorities().add(authority);
      }
    });
    token("authn-declaration-reference", assertion -> authn(assertion, null, "https://idp.partner.example/context"));
    token("authn-declaration", assertion -> {
      AuthnContextDecl declaration = make(AuthnContextDecl.DEFAULT_ELEMENT_NAME);
      declaration.setTextContent("a declaration");
      authn(assertion, AuthnContext.KERBEROS_AUTHN_CTX, null).getAuthnContext().setAuthnContextDecl(declaration);
    });
    token("authn-several", assertion -> {
      authn(assertion, AuthnContext.PASSWORD_AUTHN_CTX, null).setSessionNotOnOrAfter(time("2100-01-01T00:00:00.000Z"));
      authn(assertion, AuthnContext.X509_AUTHN_CTX, null).setSessionNotOnOrAfter(time("2090-01-01T00:00:00.000Z"));
      authn(assertion, AuthnContext.KERBEROS_AUTHN_CTX, null);
    });
    token("statements-attributes-first", assertion -> {
      attribute(assertion, "role", null, null).getAttributeValues().add(text("auditor"));
      authn(assertion, AuthnContext.PASSWORD_AUTHN_CTX, null);
      assertion.getAttributeStatements().add(make(AttributeStatement.DEFAULT_ELEMENT_NAME));
      attribute(assertion, "mail", null, null).getAttributeValues().add(text("alice@corp.example"));
    });
  }

  private static void attributes() throws Exception {
    token("attributes-all-values", assertion -> {
      List<XMLObject> values =
          attribute(assertion, "urn:oid:2.5.4.3", Attribute.URI_REFERENCE, "cn").getAttributeValues();
      values.add(text("Alice Liddell"));
      values.add(any(" blanks \n kept "));
      values.add(any(null));
      values.add(any("mixed ", any("inner"), any(null)));
      values.add(any(null, nameId("aB3", FORMATS_2 + "persistent", "https://idp.partner.example/", null, null)));
      XSAny nil = any(null);
      nil.getUnknownAttributes().put(NIL, "true");
      values.add(nil);
      XSInteger number = (XSInteger) new XSIntegerBuilder().buildObject(AttributeValue.DEFAULT_ELEMENT_NAME,
          XSInteger.TYPE_NAME);
      number.setValue(42);
      values.add(number);
      attribute(assertion, "none", Attribute.BASIC, null);
      Attribute foreign = attribute(assertion, "foreign", "urn:example:attributes", null);
      foreign.getUnknownAttributes().put(new javax.xml.namespace.QName("urn:example", "a", "ex"), "1");
      foreign.getAttributeValues().add(text("gr\u00fcn \ud83d\ude00"));
    });
    token("attributes-known", assertion -> {
      List<XMLObject> groups = attribute(assertion,
          "http://www.rsa.com/schemas/attr-names/2009/01/GroupIdentity", Attribute.URI_REFERENCE, null)
          .getAttributeValues();
      groups.add(text("corp.example\\Users"));
      groups.add(text("users"));
      attribute(assertion, "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname", Attribute.URI_REFERENCE,
          "first").getAttributeValues().add(text("Alice"));
      attribute(assertion, "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname", Attribute.URI_REFERENCE,
          null).getAttributeValues().add(text("Liddell"));
    });
  }

  private static void advice() throws Exception {
    token("advice-everything", assertion -> {
      Advice advice = make(Advice.DEFAULT_ELEMENT_NAME);
      AssertionIDRef reference = make(AssertionIDRef.DEFAULT_ELEMENT_NAME);
      reference.setAssertionID("_another");
      advice.getAssertionIDReferences().add(reference);
      AssertionURIRef uri = make(AssertionURIRef.DEFAULT_ELEMENT_NAME);
      uri.setAssertionURI("https://idp.partner.example/assertions/1");
      advice.getAssertionURIReferences().add(uri);
      try {
        Assertion nested = plain("nested");
        confirm(nested, BEARER);
        nested.getSubject().setNameID(nameId("mallory", null, null, null, null));
        advice.getAssertions().add(nested);
      } catch (Exception failure) {
        throw new IllegalStateException(failure);
      }
      XSAny foreign = (XSAny) new XSAnyBuilder().buildObject("urn:example", "anything", "ex");
      foreign.setTextContent("mallory");
      advice.getChildren().add(foreign);
      assertion.setAdvice(advice);
    });
  }

  private static void delegation() throws Exception {
    token("delegation", assertion -> delegate(assertion, "first@corp.example", "last@corp.example"));
    token("delegation-confirmed", assertion -> {
      delegate(assertion, "first@corp.example", "last@corp.example");
      confirm(assertion, BEARER).setNameID(nameId("last@corp.example", null, null, null, null));
    });
  }

  private static void delegate(Assertion assertion, String... names) {
    DelegationRestrictionType restriction = (DelegationRestrictionType)
        org.opensaml.core.xml.config.XMLObjectProviderRegistrySupport.getBuilderFactory()
            .<DelegationRestrictionType>getBuilderOrThrow(DelegationRestrictionType.TYPE_NAME)
            .buildObject(Condition.DEFAULT_ELEMENT_NAME, DelegationRestrictionType.TYPE_NAME);
    for (String name : names) {
      Delegate delegate = make(Delegate.DEFAULT_ELEMENT_NAME);
      delegate.setDelegationInstant(time("2020-01-01T00:00:01.000Z"));
      delegate.setNameID(nameId(name, null, null, null, null));
      restriction.getDelegates().add(delegate);
    }
    assertion.getConditions().getConditions().add(restriction);
  }
}
