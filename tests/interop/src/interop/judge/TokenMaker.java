// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.PrivateKey;
import java.util.Base64;
import java.util.LinkedHashMap;
import java.util.Map;
import org.apache.xml.security.signature.XMLSignature;
import org.apache.xml.security.transforms.Transforms;
import org.opensaml.core.xml.config.XMLObjectProviderRegistrySupport;
import org.opensaml.saml.common.SAMLObjectContentReference;
import org.opensaml.saml.saml2.core.Assertion;
import org.opensaml.security.x509.BasicX509Credential;
import org.opensaml.xmlsec.keyinfo.KeyInfoSupport;
import org.opensaml.xmlsec.signature.KeyInfo;
import org.opensaml.xmlsec.signature.Signature;
import org.opensaml.xmlsec.signature.support.SignatureConstants;
import org.opensaml.xmlsec.signature.support.Signer;
import org.w3c.dom.Document;
import org.w3c.dom.Element;
import org.w3c.dom.NodeList;

/** Signs tokens, and changes signed ones. */
final class TokenMaker {
  private static final String EXCLUSIVE = "http://www.w3.org/2001/10/xml-exc-c14n#";

  private TokenMaker() {
  }

  /** Signs with OpenSAML, without a KeyInfo. */
  static String signByOpenSaml(TokenKinds.Kind kind, Identity issuer) throws Exception {
    return signByOpenSaml(kind, issuer, null);
  }

  /** Signs with OpenSAML; the KeyInfo has the issuer's certificate. WSS4J reads no token without a KeyInfo. */
  static String signWithCertificate(TokenKinds.Kind kind, Identity issuer) throws Exception {
    KeyInfo keyInfo = SamlObjects.make(KeyInfo.DEFAULT_ELEMENT_NAME);
    KeyInfoSupport.addCertificate(keyInfo, issuer.certificate());
    return signByOpenSaml(kind, issuer, keyInfo);
  }

  private static String signByOpenSaml(TokenKinds.Kind kind, Identity issuer, KeyInfo keyInfo) throws Exception {
    BasicX509Credential credential = new BasicX509Credential(issuer.certificate(), issuer.key());
    Signature signature = SamlObjects.make(Signature.DEFAULT_ELEMENT_NAME);
    signature.setSigningCredential(credential);
    signature.setSignatureAlgorithm(SignatureConstants.ALGO_ID_SIGNATURE_RSA_SHA256);
    signature.setCanonicalizationAlgorithm(SignatureConstants.ALGO_ID_C14N_EXCL_OMIT_COMMENTS);
    signature.setKeyInfo(keyInfo);
    Assertion assertion = kind.assertion();
    assertion.setSignature(signature);
    ((SAMLObjectContentReference) signature.getContentReferences().get(0))
      .setDigestAlgorithm(SignatureConstants.ALGO_ID_DIGEST_SHA256);
    Element root = XMLObjectProviderRegistrySupport.getMarshallerFactory().getMarshaller(assertion)
      .marshall(assertion);
    kind.treeChange().accept(root);
    Signer.signObject(signature);
    return Xml.write(root);
  }

  /** Signs with Santuario, which has algorithms that OpenSAML does not offer. */
  static String signBySantuario(Assertion assertion, String signatureMethod, String digestMethod, Identity issuer)
    throws Exception {
    Element marshalled = XMLObjectProviderRegistrySupport.getMarshallerFactory().getMarshaller(assertion)
      .marshall(assertion);
    Document document = Xml.parse(Xml.write(marshalled));
    Element root = document.getDocumentElement();
    root.setIdAttribute("ID", true);
    XMLSignature signature = new XMLSignature(document, "", signatureMethod, EXCLUSIVE);
    root.insertBefore(signature.getElement(), Xml.child(root, Xml.SAML, "Subject"));
    Transforms transforms = new Transforms(document);
    transforms.addTransform(Transforms.TRANSFORM_ENVELOPED_SIGNATURE);
    transforms.addTransform(EXCLUSIVE);
    signature.addDocument("#" + root.getAttribute("ID"), transforms, digestMethod);
    PrivateKey key = issuer.key();
    signature.sign(key);
    return Xml.write(root);
  }

  /** Copies of a signed token, each with one change, under the name of the change. */
  static Map<String, String> changedCopies(String token) throws Exception {
    Map<String, String> copies = new LinkedHashMap<>();
    for (String name : new String[] {"NameID", "DigestValue", "SignatureValue", "IssueInstant"}) {
      Document document = Xml.parse(token);
      Element root = document.getDocumentElement();
      Element signature = Xml.child(root, Xml.DS, "Signature");
      switch (name) {
        case "NameID" -> {
          // Changes each name in the subject. If the names differed, the token could be refused for the difference.
          NodeList nameIds = Xml.child(root, Xml.SAML, "Subject").getElementsByTagNameNS(Xml.SAML, "NameID");
          for (int index = 0; index < nameIds.getLength(); ++index) {
            nameIds.item(index).setTextContent("x" + nameIds.item(index).getTextContent());
          }
        }
        case "IssueInstant" -> {
          String instant = root.getAttribute("IssueInstant");
          char digit = instant.charAt(18) == '0' ? '1' : '0';
          root.setAttribute("IssueInstant", instant.substring(0, 18) + digit + instant.substring(19));
        }
        default -> {
          Element value = Xml.find(signature, Xml.DS, name);
          byte[] octets = Base64.getMimeDecoder().decode(value.getTextContent());
          octets[octets.length / 2] ^= 1;
          value.setTextContent(Base64.getEncoder().encodeToString(octets));
        }
      }
      copies.put(name, Xml.write(root));
    }
    return copies;
  }
}
