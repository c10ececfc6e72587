// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import static interop.judge.SamlObjects.attribute;
import static interop.judge.SamlObjects.attributes;
import static interop.judge.SamlObjects.audience;
import static interop.judge.SamlObjects.authentication;
import static interop.judge.SamlObjects.bearer;
import static interop.judge.SamlObjects.bearerFor;
import static interop.judge.SamlObjects.confirmation;
import static interop.judge.SamlObjects.foreign;
import static interop.judge.SamlObjects.holderOfKey;
import static interop.judge.SamlObjects.make;
import static interop.judge.SamlObjects.nameId;
import static interop.judge.SamlObjects.value;

import java.security.cert.X509Certificate;
import java.util.ArrayList;
import java.util.List;
import java.util.function.Consumer;
import javax.xml.namespace.QName;
import org.apache.xml.security.keys.content.KeyValue;
import org.joda.time.DateTime;
import org.opensaml.core.xml.schema.XSAny;
import org.opensaml.core.xml.schema.XSInteger;
import org.opensaml.core.xml.schema.XSString;
import org.opensaml.saml.saml2.core.Action;
import org.opensaml.saml.saml2.core.Advice;
import org.opensaml.saml.saml2.core.Assertion;
import org.opensaml.saml.saml2.core.AssertionIDRef;
import org.opensaml.saml.saml2.core.Attribute;
import org.opensaml.saml.saml2.core.AttributeStatement;
import org.opensaml.saml.saml2.core.AttributeValue;
import org.opensaml.saml.saml2.core.Audience;
import org.opensaml.saml.saml2.core.AuthnContextDeclRef;
import org.opensaml.saml.saml2.core.AuthnStatement;
import org.opensaml.saml.saml2.core.AuthenticatingAuthority;
import org.opensaml.saml.saml2.core.AuthzDecisionStatement;
import org.opensaml.saml.saml2.core.DecisionTypeEnumeration;
import org.opensaml.saml.saml2.core.EncryptedAttribute;
import org.opensaml.saml.saml2.core.EncryptedID;
import org.opensaml.saml.saml2.core.NameID;
import org.opensaml.saml.saml2.core.OneTimeUse;
import org.opensaml.saml.saml2.core.ProxyRestriction;
import org.opensaml.saml.saml2.core.SubjectConfirmation;
import org.opensaml.saml.saml2.core.SubjectConfirmationData;
import org.opensaml.saml.saml2.core.SubjectLocality;
import org.w3c.dom.Element;

/** The kinds of token that an issuer may write, and those that the tool must refuse with a stated reason. */
final class TokenKinds {
  static final String ACCEPTED = "accepted";

  /** A token: how it is made, and the subject that it must have here, or part of the text of its refusal. */
  record Kind(String name, Assertion assertion, Consumer<Element> treeChange, String subject, String domain,
    String refusal) {
  }

  private static final String FORMAT = "urn:oasis:names:tc:SAML:1.1:nameid-format:";
  private static final String FORMAT2 = "urn:oasis:names:tc:SAML:2.0:nameid-format:";
  private static final String UPN = "http://schemas.xmlsoap.org/claims/UPN";
  private static final String UNSPECIFIED = "nameid:unspecified";

  private static final String XMLNS = "http://www.w3.org/2000/xmlns/";
  private static final String XSI = "http://www.w3.org/2001/XMLSchema-instance";
  private static final Consumer<Element> NOTHING = root -> { };

  private final List<Kind> kinds = new ArrayList<>();
  private final X509Certificate holder;
  private final X509Certificate curveHolder;

  TokenKinds(X509Certificate holder, X509Certificate curveHolder) {
    this.holder = holder;
    this.curveHolder = curveHolder;
    addNames();
    addConfirmations();
    addConditions();
    addStatements();
    addAttributes();
    addRefused();
  }

  List<Kind> all() {
    return kinds;
  }

  private void accept(String name, Consumer<Assertion> change) {
    Assertion assertion = SamlObjects.assertion();
    change.accept(assertion);
    kinds.add(new Kind(name, assertion, NOTHING, "alice", UNSPECIFIED, null));
  }

  private void refuse(String name, String text, Consumer<Assertion> change) {
    Assertion assertion = SamlObjects.assertion();
    change.accept(assertion);
    kinds.add(new Kind(name, assertion, NOTHING, null, null, text));
  }

  /** Changes the tree before it is signed, because OpenSAML has no objects for that content. */
  private void refuseTree(String name, String text, Consumer<Element> change) {
    kinds.add(new Kind(name, SamlObjects.assertion(), change, null, null, text));
  }

  private static Element saml(Element root, String name) {
    return root.getOwnerDocument().createElementNS(Xml.SAML, root.getPrefix() + ":" + name);
  }

  /** Adds the declarations as attributes. Otherwise the signed text would differ from the text that is written. */
  private static void setType(Element element, String type) {
    element.setAttributeNS(XMLNS, "xmlns:p", "urn:partner.example");
    element.setAttributeNS(XMLNS, "xmlns:xsi", XSI);
    element.setAttributeNS(XSI, "xsi:type", type);
  }

  private void name(String kind, NameID nameId, String subject, String domain) {
    Assertion assertion = SamlObjects.assertion();
    assertion.getSubject().setNameID(nameId);
    kinds.add(new Kind("NameID: " + kind, assertion, NOTHING, subject, domain, null));
  }

  private void addNames() {
    name("no Format", nameId("alice", null), "alice", UNSPECIFIED);
    name("unspecified", nameId("alice@corp.example", FORMAT + "unspecified"), "alice@corp.example", UNSPECIFIED);
    name("UPN", nameId("zoë@corp.example", UPN), "zoë", "corp.example");
    name("emailAddress", nameId("zoë@corp.example", FORMAT + "emailAddress"), "zoë@corp.example", "nameid:email");
    name("X509SubjectName", nameId("CN=Zoë €, O=Größe", FORMAT + "X509SubjectName"), "CN=Zoë €, O=Größe",
      "nameid:x509-subject");
    name("WindowsDomainQualifiedName", nameId("CORP\\zoë", FORMAT + "WindowsDomainQualifiedName"), "CORP\\zoë",
      "nameid:windows");
    name("kerberos", nameId("alice@CORP.EXAMPLE", FORMAT2 + "kerberos"), "alice@CORP.EXAMPLE", "nameid:kerberos");
    name("entity", nameId("https://app.example", FORMAT2 + "entity"), "https://app.example", "nameid:entity");
    name("persistent", nameId("aB3d", FORMAT2 + "persistent"), "aB3d", "nameid:persistent");
    name("transient", nameId("_1f", FORMAT2 + "transient"), "_1f", "nameid:transient");
    name("another format", nameId("4711", "urn:Partner:staff"), "4711", "nameid:format=urn:%50artner:staff");
    name("beyond the basic plane", nameId("日本語 😀", FORMAT2 + "persistent"), "日本語 😀",
      "nameid:persistent");
    NameID qualified = nameId("aB3d", FORMAT2 + "persistent");
    qualified.setNameQualifier("https://idp.example/ö");
    name("persistent, NameQualifier", qualified, "aB3d",
      "nameid:persistent;name-qualifier=https://idp.example/%C3%B6");
    NameID both = nameId("aB3d", FORMAT2 + "persistent");
    both.setNameQualifier("https://idp.example");
    both.setSPNameQualifier("https://sp.example");
    both.setSPProvidedID("x");
    name("persistent, all qualifiers", both, "aB3d",
      "nameid:persistent;name-qualifier=https://idp.example;sp-name-qualifier=https://sp.example");
    NameID upn = nameId("alice@corp.example", UPN);
    upn.setNameQualifier("q");
    name("UPN, NameQualifier", upn, "alice@corp.example", "nameid:upn;name-qualifier=q");
    Assertion typed = SamlObjects.typedAssertion();
    kinds.add(new Kind("xsi:type on Assertion", typed, NOTHING, "alice", UNSPECIFIED, null));
    accept("Issuer with Format", assertion -> assertion.getIssuer().setFormat(FORMAT2 + "entity"));
    accept("Issuer with NameQualifier", assertion -> assertion.getIssuer().setNameQualifier("corp"));
  }

  private void confirm(String name, SubjectConfirmation... confirmations) {
    accept("confirmation: " + name, assertion -> {
      assertion.getSubject().getSubjectConfirmations().clear();
      assertion.getSubject().getSubjectConfirmations().addAll(List.of(confirmations));
    });
  }

  private void addConfirmations() {
    confirm("bearer without data", bearer());
    SubjectConfirmation full = bearerFor("https://app.example");
    SubjectConfirmationData data = full.getSubjectConfirmationData();
    data.setInResponseTo("_request");
    data.setAddress("192.0.2.1");
    data.setNotBefore(new DateTime());
    confirm("bearer with Recipient, InResponseTo, Address, NotBefore", full);
    confirm("holder-of-key, certificate", holderOfKey(holder, null));
    confirm("holder-of-key, RSAKeyValue", holderOfKey(null, holder.getPublicKey()));
    Assertion curve = withConfirmation(holderOfKey(null, null));
    kinds.add(new Kind("confirmation: holder-of-key, ECKeyValue", curve, this::addCurveKey, "alice", UNSPECIFIED,
      null));
    confirm("holder-of-key, certificate and key value", holderOfKey(holder, holder.getPublicKey()));
    confirm("sender-vouches, then bearer", confirmation("sender-vouches"), bearer());
    confirm("holder-of-key, then bearer", holderOfKey(holder, null), bearerFor("https://app.example"));
    SubjectConfirmation ended = bearerFor("https://app.example");
    ended.getSubjectConfirmationData().setNotOnOrAfter(new DateTime().minusDays(1));
    confirm("bearer that has ended, then bearer", ended, bearer());
    SubjectConfirmation named = bearer();
    named.setNameID(nameId("alice", null));
    confirm("bearer with the subject's NameID", named);
    kinds.add(new Kind("confirmation: certificate and another key value",
      withConfirmation(holderOfKey(holder, null)), this::addCurveKey, null, null, "key"));
    kinds.add(new Kind("confirmation: sender-vouches only", withConfirmation(confirmation("sender-vouches")), NOTHING,
      null, null, "sender-vouches"));
  }

  private static Assertion withConfirmation(SubjectConfirmation confirmation) {
    Assertion assertion = SamlObjects.assertion();
    assertion.getSubject().getSubjectConfirmations().clear();
    assertion.getSubject().getSubjectConfirmations().add(confirmation);
    return assertion;
  }

  /** Santuario writes key values of curves; OpenSAML does not. */
  private void addCurveKey(Element root) {
    Element keyInfo = Xml.find(Xml.child(root, Xml.SAML, "Subject"), Xml.DS, "KeyInfo");
    keyInfo.appendChild(new KeyValue(root.getOwnerDocument(), curveHolder.getPublicKey()).getElement());
  }

  private void addConditions() {
    accept("AudienceRestriction",
      assertion -> assertion.getConditions().getConditions().add(audience("urn:a", "urn:b")));
    accept("AudienceRestriction twice", assertion -> {
      assertion.getConditions().getConditions().add(audience("urn:a", "urn:b"));
      assertion.getConditions().getConditions().add(audience("urn:b", "urn:ö"));
    });
    accept("OneTimeUse", assertion -> assertion.getConditions().getConditions().add(
      make(OneTimeUse.DEFAULT_ELEMENT_NAME)));
    accept("ProxyRestriction", assertion -> {
      ProxyRestriction restriction = make(ProxyRestriction.DEFAULT_ELEMENT_NAME);
      restriction.setProxyCount(2);
      Audience audience = make(Audience.DEFAULT_ELEMENT_NAME);
      audience.setAudienceURI("urn:a");
      restriction.getAudiences().add(audience);
      assertion.getConditions().getConditions().add(restriction);
    });
    accept("ProxyRestriction, empty", assertion -> assertion.getConditions().getConditions().add(
      make(ProxyRestriction.DEFAULT_ELEMENT_NAME)));
    accept("no NotBefore", assertion -> assertion.getConditions().setNotBefore(null));
    accept("Advice with an assertion and a reference", assertion -> {
      Advice advice = make(Advice.DEFAULT_ELEMENT_NAME);
      AssertionIDRef reference = make(AssertionIDRef.DEFAULT_ELEMENT_NAME);
      reference.setAssertionID("_elsewhere");
      advice.getChildren().add(reference);
      advice.getChildren().add(SamlObjects.assertion());
      advice.getChildren().add(foreign("hint", "grün"));
      assertion.setAdvice(advice);
    });
  }

  private void addStatements() {
    accept("AuthnStatement", assertion -> assertion.getAuthnStatements().add(authentication()));
    accept("AuthnStatement with everything, and another", assertion -> {
      AuthnStatement statement = authentication();
      statement.setSessionIndex("s-ö");
      statement.setSessionNotOnOrAfter(new DateTime().plusMinutes(SamlObjects.LIFETIME_MINUTES));
      SubjectLocality locality = make(SubjectLocality.DEFAULT_ELEMENT_NAME);
      locality.setAddress("192.0.2.1");
      locality.setDNSName("desk.example");
      statement.setSubjectLocality(locality);
      AuthenticatingAuthority authority = make(AuthenticatingAuthority.DEFAULT_ELEMENT_NAME);
      authority.setURI("https://first.example");
      statement.getAuthnContext().getAuthenticatingAuthorities().add(authority);
      assertion.getAuthnStatements().add(statement);
      AuthnStatement other = authentication();
      other.getAuthnContext().setAuthnContextClassRef(null);
      AuthnContextDeclRef declaration = make(AuthnContextDeclRef.DEFAULT_ELEMENT_NAME);
      declaration.setAuthnContextDeclRef("https://idp.example/context");
      other.getAuthnContext().setAuthnContextDeclRef(declaration);
      assertion.getAuthnStatements().add(other);
    });
    accept("attributes before authentication", assertion -> {
      assertion.getStatements().add(attributes(attribute("a", value("b"))));
      assertion.getStatements().add(authentication());
    });
  }

  private void attributeKind(String name, Attribute attribute) {
    accept("attribute: " + name, assertion -> assertion.getAttributeStatements().add(attributes(attribute)));
  }

  private void addAttributes() {
    Attribute named = attribute("urn:größe", value("groß €"));
    named.setNameFormat("urn:oasis:names:tc:SAML:2.0:attrname-format:uri");
    named.setFriendlyName("Größe");
    attributeKind("names and value beyond ASCII", named);
    XSString text = make(AttributeValue.DEFAULT_ELEMENT_NAME, XSString.TYPE_NAME);
    text.setValue("x");
    XSInteger number = make(AttributeValue.DEFAULT_ELEMENT_NAME, XSInteger.TYPE_NAME);
    number.setValue(1);
    attributeKind("typed values", attribute("typed", text, number));
    attributeKind("XML value", attribute("xml", value(null, foreign("a", "ä"), foreign("b", ""))));
    attributeKind("mixed value", attribute("mixed", value("text", foreign("a", "ä"))));
    attributeKind("NameID value", attribute("eduPersonTargetedID", value(null, nameId("x", FORMAT2 + "persistent"))));
    XSAny nil = value(null);
    nil.getUnknownAttributes().put(new QName("http://www.w3.org/2001/XMLSchema-instance", "nil", "xsi"), "true");
    attributeKind("nil value", attribute("nil", nil));
    attributeKind("no value", attribute("none"));
    attributeKind("empty value", attribute("empty", value("")));
    Attribute foreignXml = attribute("foreign", value("x"));
    foreignXml.getUnknownAttributes().put(new QName("urn:partner.example", "source", "p"), "ldap");
    attributeKind("foreign XML attribute", foreignXml);
    accept("two attribute statements", assertion -> {
      assertion.getAttributeStatements().add(attributes(attribute("a", value("1"))));
      assertion.getAttributeStatements().add(attributes(attribute("a", value("2"))));
    });
  }

  private void addRefused() {
    refuse("EncryptedID", "EncryptedID", assertion -> {
      assertion.getSubject().setNameID(null);
      assertion.getSubject().setEncryptedID(make(EncryptedID.DEFAULT_ELEMENT_NAME));
    });
    refuse("EncryptedAttribute", "EncryptedAttribute", assertion -> {
      AttributeStatement statement = attributes();
      statement.getEncryptedAttributes().add(make(EncryptedAttribute.DEFAULT_ELEMENT_NAME));
      assertion.getAttributeStatements().add(statement);
    });
    refuse("AuthzDecisionStatement", "AuthzDecisionStatement", assertion -> {
      AuthzDecisionStatement statement = make(AuthzDecisionStatement.DEFAULT_ELEMENT_NAME);
      statement.setResource("urn:door");
      statement.setDecision(DecisionTypeEnumeration.PERMIT);
      Action action = make(Action.DEFAULT_ELEMENT_NAME);
      action.setNamespace("urn:doors");
      action.setAction("open");
      statement.getActions().add(action);
      assertion.getAuthzDecisionStatements().add(statement);
    });
    refuseTree("unknown condition", "indeterminate", root -> {
      Element condition = saml(root, "Condition");
      setType(condition, "p:OnlyOnMondays");
      Xml.child(root, Xml.SAML, "Conditions").appendChild(condition);
    });
    refuseTree("BaseID", "BaseID", root -> {
      Element name = Xml.find(root, Xml.SAML, "NameID");
      Element base = saml(root, "BaseID");
      setType(base, "p:Number");
      name.getParentNode().replaceChild(base, name);
    });
    refuseTree("unknown statement", "Statement", root -> {
      Element statement = saml(root, "Statement");
      setType(statement, "p:Mood");
      root.appendChild(statement);
    });
    refuseTree("empty Format", "Format", root -> Xml.find(Xml.child(root, Xml.SAML, "Subject"), Xml.SAML, "NameID")
      .setAttributeNS(null, "Format", " "));
    refuse("empty NameID", "NameID", assertion -> assertion.getSubject().setNameID(nameId("", null)));
    refuse("no Subject", "Subject", assertion -> assertion.setSubject(null));
    refuse("no confirmation", "SubjectConfirmation",
      assertion -> assertion.getSubject().getSubjectConfirmations().clear());
    refuse("no Conditions", "Conditions", assertion -> assertion.setConditions(null));
    refuse("no end", "NotOnOrAfter", assertion -> assertion.getConditions().setNotOnOrAfter(null));
    refuse("expired", "expired", assertion -> {
      assertion.getConditions().setNotBefore(new DateTime().minusHours(2));
      assertion.getConditions().setNotOnOrAfter(new DateTime().minusHours(1));
    });
    refuse("session ended", "session", assertion -> {
      AuthnStatement statement = authentication();
      statement.setSessionNotOnOrAfter(new DateTime().minusHours(1));
      assertion.getAuthnStatements().add(statement);
    });
    refuse("two OneTimeUse", "OneTimeUse", assertion -> {
      assertion.getConditions().getConditions().add(make(OneTimeUse.DEFAULT_ELEMENT_NAME));
      assertion.getConditions().getConditions().add(make(OneTimeUse.DEFAULT_ELEMENT_NAME));
    });
  }
}
