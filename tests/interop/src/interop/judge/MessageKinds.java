// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.util.ArrayList;
import java.util.List;

/** The kinds of message that WSS4J signs with the key of a token, or to which it attaches a bearer token. */
final class MessageKinds {
  /** How the signature's KeyInfo names the key. */
  enum KeyForm {
    /** There is no signature. */
    NONE,
    /** A reference to the token by its identifier. The other two have another TokenType than WSS4J writes. */
    KEY_IDENTIFIER, KEY_IDENTIFIER_OTHER_TYPE, KEY_IDENTIFIER_NO_TYPE,
    /** A reference to the token by a URI. */
    DIRECT_REFERENCE,
    /** The key itself. */
    KEY_VALUE, X509_DATA,
    /** References to a certificate that is the token's: in the header, in the reference, or by its names. */
    BINARY_TOKEN, X509_KEY_IDENTIFIER, THUMBPRINT, ISSUER_SERIAL
  }

  /** What is signed in addition to the body and the timestamp, and who signs in addition to the holder of the key. */
  enum Extra {
    NONE,
    /** The token, by its identifier. */
    TOKEN_BY_ID,
    /** The token, by the transform that WS-Security defines for references to tokens. */
    TOKEN_BY_REFERENCE,
    /** Another certificate signs the same parts, too; in a message that the tool signs, it signs the timestamp. */
    OTHER_SIGNATURE,
    /** The header "urn:orders" Priority, which is in every message. */
    HEADER,
    /** Not the body, or not the timestamp. */
    NO_BODY, NO_TIMESTAMP,
    /** Nothing, but another key than the token's has signed. */
    OTHER_KEY
  }

  /**
   * A message. `token` is the name of a token; an empty `role` is that of the last receiver. If `refusal` is not empty,
   * it is the reason for which this project refuses the message, and a part of its text.
   */
  record Kind(String name, String soap, String token, KeyForm form, Extra extra, boolean hasAddressing, String role,
    boolean hasPrefixLists, String algorithm, String refusal) {
    Kind withExtra(Extra other) {
      return new Kind(name, soap, token, form, other, hasAddressing, role, hasPrefixLists, algorithm, refusal);
    }

    Kind withAddressing() {
      return new Kind(name, soap, token, form, extra, true, role, hasPrefixLists, algorithm, refusal);
    }

    Kind withRole(String other) {
      return new Kind(name, soap, token, form, extra, hasAddressing, other, hasPrefixLists, algorithm, refusal);
    }

    Kind withoutPrefixLists() {
      return new Kind(name, soap, token, form, extra, hasAddressing, role, false, algorithm, refusal);
    }

    Kind withAlgorithm(String other) {
      return new Kind(name, soap, token, form, extra, hasAddressing, role, hasPrefixLists, other, refusal);
    }

    Kind refusedWith(String text) {
      return new Kind(name, soap, token, form, extra, hasAddressing, role, hasPrefixLists, algorithm, text);
    }

    boolean isSigned() {
      return form != KeyForm.NONE;
    }
  }

  static final String RSA_SHA256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
  static final String RSA_SHA512 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha512";
  static final String RSA_PSS_SHA256 = "http://www.w3.org/2007/05/xmldsig-more#sha256-rsa-MGF1";
  static final String NO_PROOF = "The message has no signature by the token's key";
  static final String TRANSFORM = "The signature of the message is not accepted: The transform algorithm";
  static final String BODY = "The signature does not cover the body";
  static final String TIMESTAMP = "The signature does not cover the timestamp";
  static final String KEY = "The signature of the message is wrong: another key made it, or signed content was changed";
  static final String ROLE = "urn:gateway";

  private static final String ECDSA = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha";

  private final List<Kind> kinds = new ArrayList<>();

  private MessageKinds() {
  }

  /** The messages that WSS4J makes. */
  static List<Kind> ofWss4j() {
    MessageKinds made = new MessageKinds();
    made.addTokens();
    made.addKeyForms();
    made.addContents();
    return made.kinds;
  }

  /** The messages that the tool makes. It writes one form of KeyInfo, with the TokenType that the dialect chooses. */
  static List<Kind> ofTool() {
    MessageKinds made = new MessageKinds();
    made.addTokens();
    List<Kind> kinds = made.kinds;
    kinds.add(kind("soap11-strict-default", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER_OTHER_TYPE));
    kinds.add(kind("soap12-ec256-default", Xml.SOAP12, "ec256-key-value", KeyForm.KEY_IDENTIFIER_OTHER_TYPE));
    for (String soap : List.of(Xml.SOAP, Xml.SOAP12)) {
      String prefix = soap.equals(Xml.SOAP) ? "soap11-" : "soap12-";
      kinds.add(kind(prefix + "addressing", soap, "strict", KeyForm.KEY_IDENTIFIER).withAddressing());
      kinds.add(kind(prefix + "header-part", soap, "ec256-certificate", KeyForm.KEY_IDENTIFIER)
        .withExtra(Extra.HEADER));
      kinds.add(kind(prefix + "role", soap, "strict", KeyForm.KEY_IDENTIFIER).withRole(ROLE));
      kinds.add(kind(prefix + "other-signature", soap, "rsa-certificate", KeyForm.KEY_IDENTIFIER)
        .withExtra(Extra.OTHER_SIGNATURE));
    }
    return kinds;
  }

  private static Kind kind(String name, String soap, String token, KeyForm form) {
    String algorithm = RSA_SHA256;
    if (token.startsWith("ec")) {
      String size = token.substring("ec".length(), "ec256".length());
      algorithm = ECDSA + (size.equals("521") ? "512" : size);
    }
    return new Kind(name, soap, token, form, Extra.NONE, false, "", true, algorithm, "");
  }

  private void addTokens() {
    for (String token : List.of("strict", "rsa-certificate", "rsa-key-value", "ec256-certificate", "ec256-key-value",
      "ec384-certificate", "ec521-key-value")) {
      kinds.add(kind("soap11-" + token, Xml.SOAP, token, KeyForm.KEY_IDENTIFIER));
      kinds.add(kind("soap12-" + token, Xml.SOAP12, token, KeyForm.KEY_IDENTIFIER));
    }
    kinds.add(kind("soap11-bearer", Xml.SOAP, "bearer", KeyForm.NONE));
    kinds.add(kind("soap12-bearer", Xml.SOAP12, "bearer", KeyForm.NONE));
  }

  private void addKeyForms() {
    kinds.add(kind("key-other-token-type", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER_OTHER_TYPE));
    kinds.add(kind("key-no-token-type", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER_NO_TYPE));
    kinds.add(kind("key-direct-reference", Xml.SOAP, "rsa-certificate", KeyForm.DIRECT_REFERENCE));
    kinds.add(kind("key-rsa-key-value", Xml.SOAP, "rsa-certificate", KeyForm.KEY_VALUE));
    kinds.add(kind("key-ec-key-value", Xml.SOAP12, "ec256-key-value", KeyForm.KEY_VALUE));
    kinds.add(kind("key-x509-data", Xml.SOAP, "rsa-certificate", KeyForm.X509_DATA));
    kinds.add(kind("key-binary-token", Xml.SOAP, "rsa-certificate", KeyForm.BINARY_TOKEN)
      .refusedWith(NO_PROOF));
    kinds.add(kind("key-x509-key-identifier", Xml.SOAP, "rsa-certificate", KeyForm.X509_KEY_IDENTIFIER)
      .refusedWith(NO_PROOF));
    kinds.add(kind("key-thumbprint", Xml.SOAP, "rsa-certificate", KeyForm.THUMBPRINT)
      .refusedWith(NO_PROOF));
    kinds.add(kind("key-issuer-serial", Xml.SOAP, "rsa-certificate", KeyForm.ISSUER_SERIAL)
      .refusedWith(NO_PROOF));
  }

  private void addContents() {
    kinds.add(kind("addressing", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withAddressing());
    kinds.add(kind("addressing-soap12", Xml.SOAP12, "ec256-certificate", KeyForm.KEY_IDENTIFIER).withAddressing());
    kinds.add(kind("header-part", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withExtra(Extra.HEADER));
    kinds.add(kind("role-soap11", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withRole(ROLE));
    kinds.add(kind("role-soap12", Xml.SOAP12, "strict", KeyForm.KEY_IDENTIFIER).withRole(ROLE));
    kinds.add(kind("no-prefix-lists", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withoutPrefixLists());
    kinds.add(kind("rsa-sha512", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withAlgorithm(RSA_SHA512));
    kinds.add(kind("rsa-pss-sha256", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withAlgorithm(RSA_PSS_SHA256));
    kinds.add(kind("token-signed", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withExtra(Extra.TOKEN_BY_ID));
    kinds.add(kind("token-signed-by-reference", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER)
      .withExtra(Extra.TOKEN_BY_REFERENCE).refusedWith(TRANSFORM));
    kinds.add(kind("body-not-signed", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withExtra(Extra.NO_BODY)
      .refusedWith(BODY));
    kinds.add(kind("timestamp-not-signed", Xml.SOAP, "strict", KeyForm.KEY_IDENTIFIER).withExtra(Extra.NO_TIMESTAMP)
      .refusedWith(TIMESTAMP));
    kinds.add(kind("other-key", Xml.SOAP, "rsa-certificate", KeyForm.KEY_IDENTIFIER).withExtra(Extra.OTHER_KEY)
      .refusedWith(KEY));
    kinds.add(kind("other-signature", Xml.SOAP, "rsa-certificate", KeyForm.KEY_IDENTIFIER)
      .withExtra(Extra.OTHER_SIGNATURE));
  }
}
