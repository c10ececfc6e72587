// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.util.ArrayList;
import java.util.Base64;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import org.w3c.dom.Attr;
import org.w3c.dom.Document;
import org.w3c.dom.Element;
import org.w3c.dom.Node;

/** Changes to a signed request that a service must notice. */
final class EnvelopeChanges {
  private interface Change {
    /** Returns false if the request does not have what the change replaces. */
    boolean apply(Document document) throws Exception;
  }

  private EnvelopeChanges() {
  }

  /** The changed copies, each under the name of the change. */
  static Map<String, String> of(String envelope, String otherCertificate) throws Exception {
    Map<String, Change> changes = new LinkedHashMap<>();
    changes.put("text in the body", document -> appendText(body(document), "x"));
    changes.put("blank in the body", document -> appendText(body(document), " "));
    changes.put("attribute in the body", document -> {
      ((Element) body(document).getFirstChild()).setAttribute("Context", "other");
      return true;
    });
    changes.put("later end", document -> extend(Xml.find(security(document), Xml.WSU, "Expires")));
    changes.put("digest", document -> changeBase64(Xml.find(messageSignature(document), Xml.DS, "DigestValue")));
    changes.put("signature value",
      document -> changeBase64(Xml.find(messageSignature(document), Xml.DS, "SignatureValue")));
    changes.put("RSA-SHA1", document -> setAlgorithm(document, "SignatureMethod", Xml.DS + "rsa-sha1"));
    changes.put("inclusive canonicalisation", document -> setAlgorithm(document, "CanonicalizationMethod",
      "http://www.w3.org/TR/2001/REC-xml-c14n-20010315"));
    changes.put("another trusted certificate", document -> setText(
      Xml.child(security(document), Xml.WSSE, "BinarySecurityToken"), otherCertificate));
    changes.put("no signature", document -> remove(messageSignature(document)));
    changes.put("body not referenced", document -> removeReference(document, body(document)));
    changes.put("timestamp not referenced",
      document -> removeReference(document, Xml.child(security(document), Xml.WSU, "Timestamp")));
    changes.put("body moved aside", EnvelopeChanges::moveBodyAside);
    changes.put("address header", document -> appendText(Xml.find(header(document), Xml.WSA, "To"), "x"));
    changes.put("presented token", EnvelopeChanges::changePresentedToken);

    Map<String, String> copies = new LinkedHashMap<>();
    for (Map.Entry<String, Change> change : changes.entrySet()) {
      Document document = Xml.parse(envelope);
      if (change.getValue().apply(document)) {
        copies.put(change.getKey(), Xml.write(document));
      }
    }
    return copies;
  }

  private static Element header(Document document) {
    return Xml.child(document.getDocumentElement(), Xml.SOAP, "Header");
  }

  private static Element body(Document document) {
    return Xml.child(document.getDocumentElement(), Xml.SOAP, "Body");
  }

  private static Element security(Document document) {
    return Xml.child(header(document), Xml.WSSE, "Security");
  }

  private static Element messageSignature(Document document) {
    return Xml.child(security(document), Xml.DS, "Signature");
  }

  private static boolean appendText(Element element, String text) {
    if (element != null) {
      element.appendChild(element.getOwnerDocument().createTextNode(text));
    }
    return element != null;
  }

  private static boolean setText(Element element, String text) {
    if (element != null) {
      element.setTextContent(text);
    }
    return element != null;
  }

  private static boolean extend(Element instant) {
    String text = instant.getTextContent();
    instant.setTextContent((Integer.parseInt(text.substring(0, 4)) + 1) + text.substring(4));
    return true;
  }

  private static boolean changeBase64(Element element) {
    byte[] octets = Base64.getMimeDecoder().decode(element.getTextContent());
    octets[octets.length / 2] ^= 1;
    return setText(element, Base64.getEncoder().encodeToString(octets));
  }

  private static boolean setAlgorithm(Document document, String name, String algorithm) {
    Xml.find(messageSignature(document), Xml.DS, name).setAttribute("Algorithm", algorithm);
    return true;
  }

  private static boolean remove(Node node) {
    node.getParentNode().removeChild(node);
    return true;
  }

  private static boolean removeReference(Document document, Element target) {
    Element signedInfo = Xml.child(messageSignature(document), Xml.DS, "SignedInfo");
    List<Element> references = new ArrayList<>();
    for (Node child = signedInfo.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element
        && element.getAttribute("URI").equals("#" + target.getAttributeNS(Xml.WSU, "Id"))) {
        references.add(element);
      }
    }
    references.forEach(EnvelopeChanges::remove);
    return !references.isEmpty();
  }

  /** The signed body stays in the message, but the service does not read it. Another body is in its place. */
  private static boolean moveBodyAside(Document document) {
    Element signed = body(document);
    Element other = (Element) signed.cloneNode(true);
    Attr id = other.getAttributeNodeNS(Xml.WSU, "Id");
    id.setValue("other");
    ((Element) other.getFirstChild()).setAttribute("Context", "other");
    document.getDocumentElement().replaceChild(other, signed);
    Element aside = document.createElementNS("urn:aside", "aside");
    aside.appendChild(signed);
    header(document).appendChild(aside);
    return true;
  }

  private static boolean changePresentedToken(Document document) {
    Element assertion = Xml.child(security(document), Xml.SAML, "Assertion");
    return assertion != null && appendText(Xml.find(assertion, Xml.SAML, "NameID"), "x");
  }
}
