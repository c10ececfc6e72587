// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.PublicKey;
import java.security.cert.CertificateEncodingException;
import java.security.cert.X509Certificate;
import java.util.UUID;
import javax.xml.namespace.QName;
import org.joda.time.DateTime;
import org.opensaml.core.xml.XMLObject;
import org.opensaml.core.xml.config.XMLObjectProviderRegistrySupport;
import org.opensaml.core.xml.schema.XSAny;
import org.opensaml.saml.common.SAMLVersion;
import org.opensaml.saml.saml2.core.Assertion;
import org.opensaml.saml.saml2.core.Attribute;
import org.opensaml.saml.saml2.core.AttributeStatement;
import org.opensaml.saml.saml2.core.AttributeValue;
import org.opensaml.saml.saml2.core.Audience;
import org.opensaml.saml.saml2.core.AudienceRestriction;
import org.opensaml.saml.saml2.core.AuthnContext;
import org.opensaml.saml.saml2.core.AuthnContextClassRef;
import org.opensaml.saml.saml2.core.AuthnStatement;
import org.opensaml.saml.saml2.core.Conditions;
import org.opensaml.saml.saml2.core.Issuer;
import org.opensaml.saml.saml2.core.KeyInfoConfirmationDataType;
import org.opensaml.saml.saml2.core.NameID;
import org.opensaml.saml.saml2.core.Subject;
import org.opensaml.saml.saml2.core.SubjectConfirmation;
import org.opensaml.saml.saml2.core.SubjectConfirmationData;
import org.opensaml.xmlsec.keyinfo.KeyInfoSupport;
import org.opensaml.xmlsec.signature.KeyInfo;

/** Makes the parts of an assertion with OpenSAML. */
final class SamlObjects {
  static final int LIFETIME_MINUTES = 30;

  private SamlObjects() {
  }

  @SuppressWarnings("unchecked")
  static <T extends XMLObject> T make(QName name) {
    return (T) XMLObjectProviderRegistrySupport.getBuilderFactory().getBuilderOrThrow(name).buildObject(name);
  }

  @SuppressWarnings("unchecked")
  static <T extends XMLObject> T make(QName name, QName type) {
    return (T) XMLObjectProviderRegistrySupport.getBuilderFactory().getBuilderOrThrow(type).buildObject(name, type);
  }

  /** What most tokens have: an issuer, a subject with a bearer confirmation, and conditions. */
  static Assertion assertion() {
    return fill(make(Assertion.DEFAULT_ELEMENT_NAME));
  }

  /** The same with an xsi:type. */
  static Assertion typedAssertion() {
    return fill(make(Assertion.DEFAULT_ELEMENT_NAME, Assertion.TYPE_NAME));
  }

  private static Assertion fill(Assertion assertion) {
    DateTime now = new DateTime();
    assertion.setID("_" + UUID.randomUUID());
    assertion.setVersion(SAMLVersion.VERSION_20);
    assertion.setIssueInstant(now);
    Issuer issuer = make(Issuer.DEFAULT_ELEMENT_NAME);
    issuer.setValue("https://idp.partner.example/sts");
    assertion.setIssuer(issuer);
    Subject subject = make(Subject.DEFAULT_ELEMENT_NAME);
    subject.setNameID(nameId("alice", null));
    subject.getSubjectConfirmations().add(bearer());
    assertion.setSubject(subject);
    Conditions conditions = make(Conditions.DEFAULT_ELEMENT_NAME);
    conditions.setNotBefore(now);
    conditions.setNotOnOrAfter(now.plusMinutes(LIFETIME_MINUTES));
    assertion.setConditions(conditions);
    return assertion;
  }

  static NameID nameId(String value, String format) {
    NameID name = make(NameID.DEFAULT_ELEMENT_NAME);
    name.setValue(value);
    name.setFormat(format);
    return name;
  }

  static SubjectConfirmation confirmation(String method) {
    SubjectConfirmation confirmation = make(SubjectConfirmation.DEFAULT_ELEMENT_NAME);
    confirmation.setMethod("urn:oasis:names:tc:SAML:2.0:cm:" + method);
    return confirmation;
  }

  /** A bearer confirmation without data. */
  static SubjectConfirmation bearer() {
    return confirmation("bearer");
  }

  /** A bearer confirmation with an address and an end. */
  static SubjectConfirmation bearerFor(String recipient) {
    SubjectConfirmationData data = make(SubjectConfirmationData.DEFAULT_ELEMENT_NAME);
    data.setRecipient(recipient);
    data.setNotOnOrAfter(new DateTime().plusMinutes(LIFETIME_MINUTES));
    SubjectConfirmation confirmation = bearer();
    confirmation.setSubjectConfirmationData(data);
    return confirmation;
  }

  /** A holder-of-key confirmation; each of the two keys may be null. */
  static SubjectConfirmation holderOfKey(X509Certificate certificate, PublicKey key) {
    KeyInfo keyInfo = make(KeyInfo.DEFAULT_ELEMENT_NAME);
    try {
      if (certificate != null) {
        KeyInfoSupport.addCertificate(keyInfo, certificate);
      }
    } catch (CertificateEncodingException failure) {
      throw new IllegalStateException(failure);
    }
    if (key != null) {
      KeyInfoSupport.addPublicKey(keyInfo, key);
    }
    KeyInfoConfirmationDataType data = make(SubjectConfirmationData.DEFAULT_ELEMENT_NAME,
      KeyInfoConfirmationDataType.TYPE_NAME);
    data.getKeyInfos().add(keyInfo);
    SubjectConfirmation confirmation = confirmation("holder-of-key");
    confirmation.setSubjectConfirmationData(data);
    return confirmation;
  }

  static AudienceRestriction audience(String... uris) {
    AudienceRestriction restriction = make(AudienceRestriction.DEFAULT_ELEMENT_NAME);
    for (String uri : uris) {
      Audience audience = make(Audience.DEFAULT_ELEMENT_NAME);
      audience.setAudienceURI(uri);
      restriction.getAudiences().add(audience);
    }
    return restriction;
  }

  static AuthnStatement authentication() {
    AuthnContextClassRef reference = make(AuthnContextClassRef.DEFAULT_ELEMENT_NAME);
    reference.setAuthnContextClassRef("urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport");
    AuthnContext context = make(AuthnContext.DEFAULT_ELEMENT_NAME);
    context.setAuthnContextClassRef(reference);
    AuthnStatement statement = make(AuthnStatement.DEFAULT_ELEMENT_NAME);
    statement.setAuthnInstant(new DateTime());
    statement.setAuthnContext(context);
    return statement;
  }

  static Attribute attribute(String name, XMLObject... values) {
    Attribute attribute = make(Attribute.DEFAULT_ELEMENT_NAME);
    attribute.setName(name);
    for (XMLObject value : values) {
      attribute.getAttributeValues().add(value);
    }
    return attribute;
  }

  static AttributeStatement attributes(Attribute... attributes) {
    AttributeStatement statement = make(AttributeStatement.DEFAULT_ELEMENT_NAME);
    for (Attribute attribute : attributes) {
      statement.getAttributes().add(attribute);
    }
    return statement;
  }

  /** A value of any content: text and elements. */
  static XSAny value(String text, XMLObject... children) {
    XSAny value = make(AttributeValue.DEFAULT_ELEMENT_NAME, XSAny.TYPE_NAME);
    value.setTextContent(text);
    for (XMLObject child : children) {
      value.getUnknownXMLObjects().add(child);
    }
    return value;
  }

  /** An element of a namespace that does not belong to SAML. */
  static XSAny foreign(String name, String text) {
    XSAny element = make(new QName("urn:partner.example", name, "p"), XSAny.TYPE_NAME);
    element.setTextContent(text);
    return element;
  }
}
