// SPDX-License-Identifier: Apache-2.0
// Makes signed assertions with OpenSAML and WSS4J, and details.txt, which has what OpenSAML reads in each of them.
// usage: java MakeTokens TOKEN_FOLDER OUT_FOLDER     TOKEN_FOLDER has the keys; see make.sh

import java.io.InputStream;
import java.io.StringReader;
import java.nio.file.*;
import java.security.KeyFactory;
import java.security.KeyStore;
import java.security.MessageDigest;
import java.security.PrivateKey;
import java.security.PublicKey;
import java.security.cert.CertificateFactory;
import java.security.cert.X509Certificate;
import java.security.spec.PKCS8EncodedKeySpec;
import java.util.*;
import java.util.function.Consumer;
import javax.xml.namespace.QName;
import org.joda.time.DateTime;
import org.joda.time.DateTimeZone;
import org.opensaml.core.xml.XMLObject;
import org.opensaml.core.xml.config.XMLObjectProviderRegistrySupport;
import org.opensaml.core.xml.schema.*;
import org.opensaml.core.xml.schema.impl.*;
import org.opensaml.core.xml.util.XMLObjectSupport;
import org.opensaml.saml.common.SAMLVersion;
import org.opensaml.saml.ext.saml2delrestrict.*;
import org.opensaml.saml.saml2.core.*;
import org.opensaml.security.x509.BasicX509Credential;
import org.opensaml.xmlsec.keyinfo.KeyInfoSupport;
import org.opensaml.xmlsec.signature.KeyInfo;
import org.opensaml.xmlsec.signature.Signature;
import org.opensaml.xmlsec.signature.support.*;
import org.apache.wss4j.common.crypto.Merlin;
import org.apache.wss4j.common.saml.*;
import org.apache.wss4j.common.saml.bean.*;
import org.w3c.dom.Document;
import net.shibboleth.utilities.java.support.xml.*;

public class MakeTokens {
  static final String BEARER = SubjectConfirmation.METHOD_BEARER;
  static final String HOLDER = SubjectConfirmation.METHOD_HOLDER_OF_KEY;
  static final String FORMATS = "urn:oasis:names:tc:SAML:1.1:nameid-format:";
  static final String FORMATS_2 = "urn:oasis:names:tc:SAML:2.0:nameid-format:";
  static Path tokens;
  static Path out;
  static final StringBuilder details = new StringBuilder();

  static DateTime time(String text) {
    return new DateTime(text, DateTimeZone.UTC);
  }

  @SuppressWarnings("unchecked")
  static <T extends XMLObject> T make(QName name) {
    return (T) XMLObjectSupport.buildXMLObject(name);
  }

  static PrivateKey key(String name) throws Exception {
    String pem = Files.readString(tokens.resolve(name + ".key")).replaceAll("-----[^-]*-----|\\s", "");
    return KeyFactory.getInstance("RSA").generatePrivate(new PKCS8EncodedKeySpec(Base64.getDecoder().decode(pem)));
  }

  static X509Certificate certificate(String name) {
    try (InputStream file = Files.newInputStream(tokens.resolve(name + ".crt"))) {
      return (X509Certificate) CertificateFactory.getInstance("X.509").generateCertificate(file);
    } catch (Exception failure) {
      throw new IllegalStateException(failure);
    }
  }

  static String idOf(String name) throws Exception {
    byte[] digest = MessageDigest.getInstance("SHA-256").digest(name.getBytes("UTF-8"));
    return "_" + HexFormat.of().formatHex(digest).substring(0, 32);
  }

  // A bearer token that states as little as the profile allows.
  static Assertion plain(String name) throws Exception {
    Assertion assertion = make(Assertion.DEFAULT_ELEMENT_NAME);
    assertion.setVersion(SAMLVersion.VERSION_20);
    assertion.setID(idOf(name));
    assertion.setIssueInstant(time("2020-01-01T00:00:00.000Z"));
    Issuer issuer = make(Issuer.DEFAULT_ELEMENT_NAME);
    issuer.setValue("https://idp.partner.example/sts");
    assertion.setIssuer(issuer);
    Subject subject = make(Subject.DEFAULT_ELEMENT_NAME);
    subject.setNameID(nameId("alice", null, null, null, null));
    assertion.setSubject(subject);
    Conditions conditions = make(Conditions.DEFAULT_ELEMENT_NAME);
    conditions.setNotBefore(time("2020-01-01T00:00:00.000Z"));
    conditions.setNotOnOrAfter(time("2120-01-01T00:00:00.000Z"));
    assertion.setConditions(conditions);
    return assertion;
  }

  static NameID nameId(String value, String format, String qualifier, String spQualifier, String spProvided) {
    NameID name = make(NameID.DEFAULT_ELEMENT_NAME);
    name.setValue(value);
    name.setFormat(format);
    name.setNameQualifier(qualifier);
    name.setSPNameQualifier(spQualifier);
    name.setSPProvidedID(spProvided);
    return name;
  }

  static SubjectConfirmation confirm(Assertion assertion, String method) {
    SubjectConfirmation confirmation = make(SubjectConfirmation.DEFAULT_ELEMENT_NAME);
    confirmation.setMethod(method);
    assertion.getSubject().getSubjectConfirmations().add(confirmation);
    return confirmation;
  }

  static SubjectConfirmationData data(SubjectConfirmation confirmation) {
    SubjectConfirmationData data = make(SubjectConfirmationData.DEFAULT_ELEMENT_NAME);
    confirmation.setSubjectConfirmationData(data);
    return data;
  }

  // Made by Santuario, because OpenSAML does not write the values of EC keys.
  static KeyInfo keyInfo(X509Certificate certificate, PublicKey value) {
    try {
      Document document = XMLObjectProviderRegistrySupport.getParserPool().newDocument();
      org.apache.xml.security.keys.KeyInfo keyInfo = new org.apache.xml.security.keys.KeyInfo(document);
      if (value != null) {
        keyInfo.addKeyValue(value);
      }
      if (certificate != null) {
        org.apache.xml.security.keys.content.X509Data data =
            new org.apache.xml.security.keys.content.X509Data(document);
        data.addCertificate(certificate);
        keyInfo.add(data);
      }
      document.appendChild(keyInfo.getElement());
      return (KeyInfo) XMLObjectProviderRegistrySupport.getUnmarshallerFactory()
          .getUnmarshaller(keyInfo.getElement()).unmarshall(keyInfo.getElement());
    } catch (Exception failure) {
      throw new IllegalStateException(failure);
    }
  }

  // A holder-of-key confirmation with the certificate, the key as a value, or both.
  static void holder(Assertion assertion, X509Certificate certificate, PublicKey value, boolean hasType) {
    SubjectConfirmation confirmation = confirm(assertion, HOLDER);
    SubjectConfirmationData data;
    if (hasType) {
      data = (SubjectConfirmationData) XMLObjectProviderRegistrySupport.getBuilderFactory()
          .<SubjectConfirmationData>getBuilderOrThrow(KeyInfoConfirmationDataType.TYPE_NAME)
          .buildObject(SubjectConfirmationData.DEFAULT_ELEMENT_NAME, KeyInfoConfirmationDataType.TYPE_NAME);
      confirmation.setSubjectConfirmationData(data);
    } else {
      data = data(confirmation);
    }
    KeyInfo keyInfo = keyInfo(certificate, value);
    if (data instanceof KeyInfoConfirmationDataType) {
      ((KeyInfoConfirmationDataType) data).getKeyInfos().add(keyInfo);
    } else {
      data.getUnknownXMLObjects().add(keyInfo);
    }
  }

  static AudienceRestriction restrict(String... uris) {
    AudienceRestriction restriction = make(AudienceRestriction.DEFAULT_ELEMENT_NAME);
    for (String uri : uris) {
      restriction.getAudiences().add(audience(uri));
    }
    return restriction;
  }

  static Audience audience(String uri) {
    Audience audience = make(Audience.DEFAULT_ELEMENT_NAME);
    audience.setAudienceURI(uri);
    return audience;
  }

  static AuthnStatement authn(Assertion assertion, String contextClass, String declaration) {
    AuthnStatement statement = make(AuthnStatement.DEFAULT_ELEMENT_NAME);
    statement.setAuthnInstant(time("2020-01-01T00:00:00.000Z"));
    AuthnContext context = make(AuthnContext.DEFAULT_ELEMENT_NAME);
    if (contextClass != null) {
      AuthnContextClassRef reference = make(AuthnContextClassRef.DEFAULT_ELEMENT_NAME);
      reference.setAuthnContextClassRef(contextClass);
      context.setAuthnContextClassRef(reference);
    }
    if (declaration != null) {
      AuthnContextDeclRef reference = make(AuthnContextDeclRef.DEFAULT_ELEMENT_NAME);
      reference.setAuthnContextDeclRef(declaration);
      context.setAuthnContextDeclRef(reference);
    }
    statement.setAuthnContext(context);
    assertion.getAuthnStatements().add(statement);
    return statement;
  }

  static Attribute attribute(Assertion assertion, String name, String format, String friendlyName) {
    Attribute attribute = make(Attribute.DEFAULT_ELEMENT_NAME);
    attribute.setName(name);
    attribute.setNameFormat(format);
    attribute.setFriendlyName(friendlyName);
    if (assertion.getAttributeStatements().isEmpty()) {
      assertion.getAttributeStatements().add(make(AttributeStatement.DEFAULT_ELEMENT_NAME));
    }
    assertion.getAttributeStatements().get(assertion.getAttributeStatements().size() - 1).getAttributes().add(attribute);
    return attribute;
  }

  static XSString text(String value) {
    XSString text = (XSString) new XSStringBuilder().buildObject(AttributeValue.DEFAULT_ELEMENT_NAME, XSString.TYPE_NAME);
    text.setValue(value);
    return text;
  }

  static XSAny any(String value, XMLObject... children) {
    XSAny any = (XSAny) new XSAnyBuilder().buildObject(AttributeValue.DEFAULT_ELEMENT_NAME);
    any.setTextContent(value);
    any.getUnknownXMLObjects().addAll(Arrays.asList(children));
    return any;
  }

  // Signs the assertion, writes NAME.xml, reads the file again, and adds what OpenSAML reads in it to the details.
  static void sign(String name, Assertion assertion) throws Exception {
    BasicX509Credential credential = new BasicX509Credential(certificate("sts-rsa"), key("sts-rsa"));
    Signature signature = make(Signature.DEFAULT_ELEMENT_NAME);
    signature.setSigningCredential(credential);
    signature.setCanonicalizationAlgorithm(SignatureConstants.ALGO_ID_C14N_EXCL_OMIT_COMMENTS);
    signature.setSignatureAlgorithm(SignatureConstants.ALGO_ID_SIGNATURE_RSA_SHA256);
    KeyInfo keyInfo = make(KeyInfo.DEFAULT_ELEMENT_NAME);
    KeyInfoSupport.addCertificate(keyInfo, certificate("sts-rsa"));
    signature.setKeyInfo(keyInfo);
    assertion.setSignature(signature);
    XMLObjectSupport.marshall(assertion);
    Signer.signObject(signature);
    write(name, SerializeSupport.nodeToString(assertion.getDOM()));
  }

  static void write(String name, String xml) throws Exception {
    xml = xml.replaceFirst("^<\\?xml[^>]*\\?>\\s*", "");
    Files.writeString(out.resolve(name + ".xml"), xml + "\n");
    Document document = XMLObjectProviderRegistrySupport.getParserPool().parse(new StringReader(xml));
    Assertion read = (Assertion) XMLObjectProviderRegistrySupport.getUnmarshallerFactory()
        .getUnmarshaller(document.getDocumentElement()).unmarshall(document.getDocumentElement());
    SignatureValidator.validate(read.getSignature(), new BasicX509Credential(certificate("sts-rsa")));
    details.append("== ").append(name).append('\n').append(Details.of(read));
  }

  static void token(String name, Consumer<Assertion> change) throws Exception {
    Assertion assertion = plain(name);
    change.accept(assertion);
    if (assertion.getSubject().getSubjectConfirmations().isEmpty()) {
      confirm(assertion, BEARER);
    }
    sign(name, assertion);
  }

  static void named(String name, NameID nameId) throws Exception {
    token(name, assertion -> assertion.getSubject().setNameID(nameId));
  }

  // What a token service that uses WSS4J writes when nothing is set: xsi:type on the assertion, no confirmation data.
  static void wss4j(String name, String method, Consumer<SAMLCallback> change) throws Exception {
    SAMLCallback callback = new SAMLCallback();
    callback.setSamlVersion(Version.SAML_20);
    callback.setIssuer("https://sts.partner.example/");
    callback.setSubject(new SubjectBean("alice", "http://sts.partner.example/names", method));
    callback.setConditions(new ConditionsBean(time("2020-01-01T00:00:00.000Z"), time("2120-01-01T00:00:00.000Z")));
    change.accept(callback);
    SamlAssertionWrapper wrapper = new SamlAssertionWrapper(callback);
    wrapper.getSaml2().setID(idOf(name));
    wrapper.getSaml2().setIssueInstant(time("2020-01-01T00:00:00.000Z"));
    KeyStore store = KeyStore.getInstance("PKCS12");
    store.load(null, null);
    store.setKeyEntry("sts", key("sts-rsa"), new char[] {'x'}, new java.security.cert.Certificate[] {certificate("sts-rsa")});
    Merlin crypto = new Merlin();
    crypto.setKeyStore(store);
    wrapper.signAssertion("sts", "x", crypto, false, SignatureConstants.ALGO_ID_C14N_EXCL_OMIT_COMMENTS,
        SignatureConstants.ALGO_ID_SIGNATURE_RSA_SHA256, SignatureConstants.ALGO_ID_DIGEST_SHA256);
    Document document = XMLObjectProviderRegistrySupport.getParserPool().newDocument();
    write(name, SerializeSupport.nodeToString(wrapper.toDOM(document)));
  }

  public static void main(String[] arguments) throws Exception {
    tokens = Path.of(arguments[0]);
    out = Path.of(arguments[1]);
    OpenSAMLUtil.initSamlEngine();
    Kinds.all();
    Files.writeString(out.resolve("details.txt"), details);
  }
}
