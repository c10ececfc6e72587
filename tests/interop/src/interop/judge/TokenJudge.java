// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.cert.X509Certificate;
import javax.xml.transform.dom.DOMSource;
import org.apache.xml.security.signature.XMLSignature;
import org.opensaml.core.xml.XMLObject;
import org.opensaml.core.xml.config.XMLObjectProviderRegistrySupport;
import org.opensaml.saml.common.xml.SAMLSchemaBuilder;
import org.opensaml.saml.saml2.core.Assertion;
import org.opensaml.saml.security.impl.SAMLSignatureProfileValidator;
import org.opensaml.security.x509.BasicX509Credential;
import org.opensaml.xmlsec.signature.support.SignatureException;
import org.opensaml.xmlsec.signature.support.SignatureValidator;
import org.w3c.dom.Document;
import org.w3c.dom.Element;
import org.xml.sax.SAXException;

/** Judges a token by its signature, with Santuario and with OpenSAML, and by the schema of SAML 2.0. */
final class TokenJudge {
  static final String VERIFIES = "verifies";
  static final String REFUSED = "refused";

  private TokenJudge() {
  }

  /** Judges the signature, with Santuario's secure validation. It must refer to the assertion or to the document. */
  static String bySantuario(String token, X509Certificate trusted) {
    try {
      Document document = Xml.parse(token);
      Element assertion = document.getDocumentElement();
      assertion.setIdAttribute("ID", true);
      Element element = Xml.child(assertion, Xml.DS, "Signature");
      XMLSignature signature = new XMLSignature(element, "", true);
      String uri = signature.getSignedInfo().item(0).getURI();
      boolean isWhole = uri.isEmpty() || uri.equals("#" + assertion.getAttribute("ID"));
      return isWhole && signature.getSignedInfo().getLength() == 1
        && signature.checkSignatureValue(trusted.getPublicKey()) ? VERIFIES : REFUSED;
    } catch (Exception refusal) {
      return REFUSED;
    }
  }

  /** Judges the signature, with OpenSAML's profile of signatures. */
  static String byOpenSaml(String token, X509Certificate trusted) {
    try {
      Element root = Xml.parse(token).getDocumentElement();
      XMLObject object = XMLObjectProviderRegistrySupport.getUnmarshallerFactory().getUnmarshaller(root)
        .unmarshall(root);
      Assertion assertion = (Assertion) object;
      if (assertion.getSignature() == null) {
        return REFUSED;
      }
      new SAMLSignatureProfileValidator().validate(assertion.getSignature());
      SignatureValidator.validate(assertion.getSignature(), new BasicX509Credential(trusted));
      return VERIFIES;
    } catch (SignatureException refusal) {
      return REFUSED;
    } catch (Exception failure) {
      return failure.toString();
    }
  }

  /** Judges the form, with the schema that OpenSAML has. */
  static String bySchema(String token) {
    try {
      new SAMLSchemaBuilder(SAMLSchemaBuilder.SAML1Version.SAML_11).getSAMLSchema().newValidator()
        .validate(new DOMSource(Xml.parse(token)));
      return "valid";
    } catch (SAXException refusal) {
      return "not valid";
    } catch (Exception failure) {
      return failure.toString();
    }
  }
}
