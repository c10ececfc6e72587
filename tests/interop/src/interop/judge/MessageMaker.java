// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.KeyStore;
import java.security.cert.X509Certificate;
import java.time.Instant;
import java.util.ArrayList;
import java.util.Base64;
import java.util.List;
import java.util.Map;
import org.apache.wss4j.common.WSEncryptionPart;
import org.apache.wss4j.common.crypto.Crypto;
import org.apache.wss4j.common.crypto.Merlin;
import org.apache.wss4j.common.saml.SamlAssertionWrapper;
import org.apache.wss4j.dom.WSConstants;
import org.apache.wss4j.dom.message.WSSecHeader;
import org.apache.wss4j.dom.message.WSSecSAMLToken;
import org.apache.wss4j.dom.message.WSSecSignature;
import org.apache.wss4j.dom.message.WSSecTimestamp;
import org.apache.wss4j.dom.saml.WSSecSignatureSAML;
import org.w3c.dom.Document;
import org.w3c.dom.Element;

/** Signs messages with WSS4J, with the key of a SAML token. */
final class MessageMaker {
  /** A token, and the identity of its key; the identity of a bearer token is null. */
  record Token(String xml, Identity holder) {
  }

  static final String SAML_ID = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";
  static final String OTHER_TOKEN_TYPE = "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";

  static final String ORDERS = "urn:orders";

  private static final List<String> ADDRESSING = List.of("Action", "MessageID", "To", "ReplyTo");
  private static final String WSSE11 = "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
  private static final String SHA256 = "http://www.w3.org/2001/04/xmlenc#sha256";
  private static final String PASSWORD = "message";
  private static final int LIFETIME_SECONDS = 300;

  private final Map<String, Token> tokens;
  private final Identity other;
  private final Instant created;

  /** `other` signs in addition, where a kind says so; `created` is the time of all messages. */
  MessageMaker(Map<String, Token> tokens, Identity other, Instant created) {
    this.tokens = tokens;
    this.other = other;
    this.created = created;
  }

  Token token(MessageKinds.Kind kind) {
    return token(kind.token());
  }

  Token token(String name) {
    return tokens.get(name);
  }

  /** A message without security, with a body and a header that a service reads. */
  static String plain(String soap, boolean hasAddressing) {
    String addressing = hasAddressing ? """
          <wsa:Action xmlns:wsa="%1$s">urn:orders:place</wsa:Action>
          <wsa:MessageID xmlns:wsa="%1$s">urn:uuid:00000000-0000-4000-8000-000000000001</wsa:MessageID>
          <wsa:To xmlns:wsa="%1$s">https://orders.example/service</wsa:To>
          <wsa:ReplyTo xmlns:wsa="%1$s"><wsa:Address>%1$s/anonymous</wsa:Address></wsa:ReplyTo>
      """.formatted(Xml.WSA) : "";
    return """
      <soap:Envelope xmlns:soap="%s" xmlns:o="urn:orders">
        <soap:Header>
          <o:Priority>high</o:Priority>
      %s  </soap:Header>
        <soap:Body>
          <o:Order xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance">
            <o:Item count="3" xsi:type="o:Part">Zahnräder &amp; Wellen</o:Item>
            <!-- a comment -->
            <Note xmlns="urn:notes"><![CDATA[<soon>]]></Note>
          </o:Order>
        </soap:Body>
      </soap:Envelope>
      """.formatted(soap, addressing);
  }

  /** The local names of the elements that the holder of the key signs, in the order of the document. */
  static List<String> covered(MessageKinds.Kind kind) {
    List<String> names = new ArrayList<>();
    if (kind.extra() == MessageKinds.Extra.TOKEN_BY_ID || kind.extra() == MessageKinds.Extra.TOKEN_BY_REFERENCE) {
      names.add("Assertion");
    }
    if (kind.extra() != MessageKinds.Extra.NO_TIMESTAMP) {
      names.add("Timestamp");
    }
    if (kind.extra() == MessageKinds.Extra.HEADER) {
      names.add("Priority");
    }
    if (kind.hasAddressing()) {
      names.addAll(ADDRESSING);
    }
    if (kind.extra() != MessageKinds.Extra.NO_BODY) {
      names.add("Body");
    }
    return names;
  }

  /** The signed elements of the SOAP header that are not in the security header, as {namespace}name. */
  static List<String> furtherParts(MessageKinds.Kind kind) {
    List<String> parts = new ArrayList<>();
    if (kind.extra() == MessageKinds.Extra.HEADER) {
      parts.add("{" + ORDERS + "}Priority");
    }
    if (kind.hasAddressing()) {
      ADDRESSING.forEach(name -> parts.add("{" + Xml.WSA + "}" + name));
    }
    return parts;
  }

  String make(MessageKinds.Kind kind) throws Exception {
    Document document = Xml.parse(plain(kind.soap(), kind.hasAddressing()));
    WSSecHeader header = new WSSecHeader(kind.role().isEmpty() ? null : kind.role(), document);
    header.insertSecurityHeader();
    WSSecTimestamp timestamp = new WSSecTimestamp(header);
    timestamp.setWsTimeSource(() -> created);
    timestamp.setTimeToLive(LIFETIME_SECONDS);
    timestamp.build();
    Token token = token(kind);
    Element assertion = Xml.parse(token.xml()).getDocumentElement();
    if (!kind.isSigned()) {
      new WSSecSAMLToken(header).build(new SamlAssertionWrapper(assertion));
      return Xml.write(document);
    }
    if (kind.extra() == MessageKinds.Extra.OTHER_SIGNATURE) {
      WSSecSignature signature = new WSSecSignature(header);
      configure(signature, kind);
      signature.setSignatureAlgorithm(MessageKinds.RSA_SHA256);
      signature.setKeyIdentifierType(WSConstants.BST_DIRECT_REFERENCE);
      signature.build(crypto(other));
    }
    switch (kind.form()) {
      case KEY_IDENTIFIER, KEY_IDENTIFIER_OTHER_TYPE, KEY_IDENTIFIER_NO_TYPE, DIRECT_REFERENCE ->
        signByReference(kind, header, assertion);
      default -> signByKey(kind, header, assertion);
    }
    return Xml.write(document);
  }

  /** A message without a token, in which another party has signed a timestamp, as an input of the tool. */
  String withOtherSignature(MessageKinds.Kind kind) throws Exception {
    Document document = Xml.parse(plain(kind.soap(), kind.hasAddressing()));
    WSSecHeader header = new WSSecHeader(document);
    header.insertSecurityHeader();
    WSSecTimestamp timestamp = new WSSecTimestamp(header);
    timestamp.setTimeToLive(LIFETIME_SECONDS);
    timestamp.build();
    WSSecSignature signature = new WSSecSignature(header);
    configure(signature, kind);
    signature.getParts().removeIf(part -> !part.getName().equals("Timestamp"));
    signature.setSignatureAlgorithm(MessageKinds.RSA_SHA256);
    signature.setKeyIdentifierType(WSConstants.BST_DIRECT_REFERENCE);
    signature.build(crypto(other));
    return Xml.write(document);
  }

  /** Signs with a reference to the token, which WSS4J then also puts into the header. */
  private void signByReference(MessageKinds.Kind kind, WSSecHeader header, Element assertion) throws Exception {
    Document document = header.getSecurityHeaderDoc();
    WSSecSignatureSAML signature = new WSSecSignatureSAML(header);
    configure(signature, kind);
    signature.setUseDirectReferenceToAssertion(kind.form() == MessageKinds.KeyForm.DIRECT_REFERENCE);
    String identifier = assertion.getAttribute("ID");
    switch (kind.form()) {
      case KEY_IDENTIFIER_OTHER_TYPE ->
        signature.setCustomKeyInfoElement(reference(document, identifier, OTHER_TOKEN_TYPE));
      case KEY_IDENTIFIER_NO_TYPE -> signature.setCustomKeyInfoElement(reference(document, identifier, null));
      default -> { }
    }
    switch (kind.extra()) {
      case TOKEN_BY_ID -> signature.getParts().add(new WSEncryptionPart(identifier));
      case TOKEN_BY_REFERENCE ->
        signature.getParts().add(new WSEncryptionPart("STRTransform", "", "Element"));
      default -> { }
    }
    Identity signer = kind.extra() == MessageKinds.Extra.OTHER_KEY ? other : token(kind).holder();
    signature.build(crypto(signer), new SamlAssertionWrapper(assertion), null, null, null);
  }

  /** Signs with the key itself, or a reference to its certificate; the token is beside the signature. */
  private void signByKey(MessageKinds.Kind kind, WSSecHeader header, Element assertion) throws Exception {
    Document document = header.getSecurityHeaderDoc();
    X509Certificate certificate = token(kind).holder().certificate();
    WSSecSignature signature = new WSSecSignature(header);
    configure(signature, kind);
    switch (kind.form()) {
      case KEY_VALUE -> signature.setKeyIdentifierType(WSConstants.KEY_VALUE);
      case X509_DATA -> signature.setCustomKeyInfoElement(x509Data(document, certificate));
      case BINARY_TOKEN -> signature.setKeyIdentifierType(WSConstants.BST_DIRECT_REFERENCE);
      case X509_KEY_IDENTIFIER -> signature.setKeyIdentifierType(WSConstants.X509_KEY_IDENTIFIER);
      case THUMBPRINT -> signature.setKeyIdentifierType(WSConstants.THUMBPRINT_IDENTIFIER);
      case ISSUER_SERIAL -> signature.setKeyIdentifierType(WSConstants.ISSUER_SERIAL);
      default -> throw new IllegalArgumentException(kind.name());
    }
    signature.build(crypto(token(kind).holder()));
    new WSSecSAMLToken(header).build(new SamlAssertionWrapper(assertion));
  }

  private static void configure(WSSecSignature signature, MessageKinds.Kind kind) {
    signature.setUserInfo("key", PASSWORD);
    signature.setSignatureAlgorithm(kind.algorithm());
    signature.setDigestAlgo(SHA256);
    signature.setAddInclusivePrefixes(kind.hasPrefixLists());
    signature.getParts().addAll(parts(kind));
  }

  private static List<WSEncryptionPart> parts(MessageKinds.Kind kind) {
    List<WSEncryptionPart> parts = new ArrayList<>();
    if (kind.extra() != MessageKinds.Extra.NO_BODY) {
      parts.add(new WSEncryptionPart("Body", kind.soap(), "Element"));
    }
    if (kind.extra() != MessageKinds.Extra.NO_TIMESTAMP) {
      parts.add(new WSEncryptionPart("Timestamp", Xml.WSU, "Element"));
    }
    if (kind.extra() == MessageKinds.Extra.HEADER) {
      parts.add(new WSEncryptionPart("Priority", ORDERS, "Element"));
    }
    if (kind.hasAddressing()) {
      for (String name : ADDRESSING) {
        parts.add(new WSEncryptionPart(name, Xml.WSA, "Element"));
      }
    }
    return parts;
  }

  /** The certificate and key under the name "key". */
  private static Crypto crypto(Identity identity) throws Exception {
    KeyStore store = KeyStore.getInstance("PKCS12");
    store.load(null, null);
    store.setKeyEntry("key", identity.key(), PASSWORD.toCharArray(), new X509Certificate[] {identity.certificate()});
    Merlin merlin = new Merlin();
    merlin.setKeyStore(store);
    return merlin;
  }

  /** A KeyInfo that refers to the token, with a TokenType or without. */
  private static Element reference(Document document, String identifier, String tokenType) throws Exception {
    return adopt(document, """
      <ds:KeyInfo xmlns:ds="%s"><wsse:SecurityTokenReference xmlns:wsse="%s"%s><wsse:KeyIdentifier ValueType="%s">%s\
      </wsse:KeyIdentifier></wsse:SecurityTokenReference></ds:KeyInfo>""".formatted(Xml.DS, Xml.WSSE,
      tokenType == null ? "" : " xmlns:wsse11=\"" + WSSE11 + "\" wsse11:TokenType=\"" + tokenType + "\"", SAML_ID,
      identifier));
  }

  private static Element x509Data(Document document, X509Certificate certificate) throws Exception {
    return adopt(document, """
      <ds:KeyInfo xmlns:ds="%s"><ds:X509Data><ds:X509Certificate>%s</ds:X509Certificate></ds:X509Data></ds:KeyInfo>"""
      .formatted(Xml.DS, Base64.getEncoder().encodeToString(certificate.getEncoded())));
  }

  private static Element adopt(Document document, String xml) throws Exception {
    return (Element) document.adoptNode(Xml.parse(xml).getDocumentElement());
  }
}
