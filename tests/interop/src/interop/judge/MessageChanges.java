// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.time.Instant;
import java.time.temporal.ChronoUnit;
import java.util.Base64;
import java.util.LinkedHashMap;
import java.util.Map;
import org.w3c.dom.Document;
import org.w3c.dom.Element;
import org.w3c.dom.Node;

/** Changes to a message with a token that every receiver must notice. */
final class MessageChanges {
  private interface Change {
    /** Returns false if the message does not have what the change replaces. */
    boolean apply(Document document, Element security) throws Exception;
  }

  private static final String NEW_ID = "other";

  private MessageChanges() {
  }

  /** The changed copies, each under the name of the change. `otherToken` is the service's, too, for another key. */
  static Map<String, String> of(String message, String role, boolean isSigned, String otherToken) throws Exception {
    Map<String, Change> changes = new LinkedHashMap<>();
    addForms(changes, otherToken);
    if (isSigned) {
      addContents(changes);
      addSignature(changes);
      addKeys(changes, otherToken);
      addWrapping(changes);
    }
    Map<String, String> copies = new LinkedHashMap<>();
    for (Map.Entry<String, Change> change : changes.entrySet()) {
      Document document = Xml.parse(message);
      if (change.getValue().apply(document, MessageJudge.security(document, role))) {
        copies.put(change.getKey(), Xml.write(document));
      }
    }
    return copies;
  }

  private static void addForms(Map<String, Change> changes, String otherToken) {
    changes.put("token's subject", (document, security) -> setText(
      Xml.find(token(security), Xml.SAML, "NameID"), "mallory"));
    changes.put("token's signature value", (document, security) -> changeBase64(
      Xml.find(Xml.child(token(security), Xml.DS, "Signature"), Xml.DS, "SignatureValue")));
    changes.put("no token", (document, security) -> remove(token(security)));
    changes.put("two tokens", (document, security) -> {
      security.appendChild(document.adoptNode(Xml.parse(otherToken).getDocumentElement()));
      return true;
    });
    changes.put("two timestamps", (document, security) -> {
      security.appendChild(renamed(timestamp(security)));
      return true;
    });
    changes.put("two security headers", (document, security) -> {
      security.getParentNode().appendChild(security.cloneNode(true));
      return true;
    });
    changes.put("old timestamp", (document, security) -> {
      Instant yesterday = Instant.now().minus(1, ChronoUnit.DAYS).truncatedTo(ChronoUnit.SECONDS);
      setText(Xml.child(timestamp(security), Xml.WSU, "Created"), yesterday.toString());
      return setText(Xml.child(timestamp(security), Xml.WSU, "Expires"), yesterday.plusSeconds(60).toString());
    });
  }

  private static void addContents(Map<String, Change> changes) {
    changes.put("text in the body", (document, security) -> append(body(document), "x"));
    changes.put("blank in the body", (document, security) -> append(body(document), " "));
    changes.put("attribute in the body", (document, security) -> {
      Xml.find(body(document), "urn:orders", "Item").setAttribute("count", "30");
      return true;
    });
    changes.put("prefix in the body", (document, security) -> {
      document.renameNode(Xml.find(body(document), "urn:orders", "Item"), "urn:orders", "p:Item");
      return true;
    });
    changes.put("later end", (document, security) -> {
      Element expires = Xml.child(timestamp(security), Xml.WSU, "Expires");
      return setText(expires, Instant.parse(expires.getTextContent()).plusSeconds(1).toString());
    });
    for (String name : new String[] {"To", "MessageID"}) {
      changes.put("header " + name, (document, security) -> append(Xml.find(header(document), Xml.WSA, name), "x"));
    }
    changes.put("header Priority", (document, security) -> {
      // It has an identifier only if it is signed.
      Element priority = Xml.child(header(document), MessageMaker.ORDERS, "Priority");
      return priority.hasAttributeNS(Xml.WSU, "Id") && append(priority, "x");
    });
  }

  private static void addSignature(Map<String, Change> changes) {
    changes.put("signature value", (document, security) -> changeBase64(
      Xml.child(signature(security), Xml.DS, "SignatureValue")));
    changes.put("digest", (document, security) -> changeBase64(
      Xml.find(signature(security), Xml.DS, "DigestValue")));
    changes.put("RSA-SHA1", (document, security) -> setAlgorithm(security, "SignatureMethod", Xml.DS + "rsa-sha1"));
    changes.put("HMAC", (document, security) -> setAlgorithm(security, "SignatureMethod", Xml.DS + "hmac-sha1"));
    changes.put("inclusive canonicalisation", (document, security) -> setAlgorithm(security,
      "CanonicalizationMethod", "http://www.w3.org/TR/2001/REC-xml-c14n-20010315"));
    changes.put("no signature", (document, security) -> remove(signature(security)));
    changes.put("body not referenced", (document, security) -> remove(reference(security, body(document))));
    changes.put("timestamp not referenced", (document, security) -> remove(reference(security, timestamp(security))));
  }

  private static void addKeys(Map<String, Change> changes, String otherToken) {
    changes.put("another token", (document, security) -> {
      Element token = token(security);
      Element other = (Element) document.adoptNode(Xml.parse(otherToken).getDocumentElement());
      String identifier = token.getAttribute("ID");
      security.replaceChild(other, token);
      replaceInKeyInfo(security, identifier, other.getAttribute("ID"));
      return true;
    });
    changes.put("reference to another token", (document, security) ->
      replaceInKeyInfo(security, token(security).getAttribute("ID"), "_other"));
    changes.put("key of another token", (document, security) -> {
      Element keyInfo = Xml.child(signature(security), Xml.DS, "KeyInfo");
      Element confirmed = Xml.find(Xml.child(Xml.parse(otherToken).getDocumentElement(), Xml.SAML, "Subject"), Xml.DS,
        "KeyInfo");
      signature(security).replaceChild(document.importNode(confirmed, true), keyInfo);
      return true;
    });
  }

  /** The signed element stays in the message, where no receiver reads it; another one has its place. */
  private static void addWrapping(Map<String, Change> changes) {
    changes.put("body moved aside", (document, security) -> {
      Element signed = body(document);
      Element other = renamed(signed);
      append(other, "x");
      signed.getParentNode().replaceChild(other, signed);
      header(document).appendChild(aside(signed));
      return true;
    });
    changes.put("body moved aside, with the identifier twice", (document, security) -> {
      Element signed = body(document);
      Element other = (Element) signed.cloneNode(true);
      append(other, "x");
      signed.getParentNode().replaceChild(other, signed);
      header(document).appendChild(aside(signed));
      return true;
    });
    changes.put("two bodies", (document, security) -> {
      Element other = renamed(body(document));
      append(other, "x");
      document.getDocumentElement().insertBefore(other, body(document));
      return true;
    });
    changes.put("timestamp moved aside", (document, security) -> {
      Element signed = timestamp(security);
      Element other = renamed(signed);
      setText(Xml.child(other, Xml.WSU, "Expires"), Instant.now().plus(1, ChronoUnit.HOURS).toString());
      security.replaceChild(other, signed);
      // Inside of the security header, because the canonical form can contain the prefixes that are declared there.
      security.appendChild(aside(signed));
      return true;
    });
    changes.put("whole message moved into a header", (document, security) -> {
      Element envelope = document.getDocumentElement();
      Element copy = (Element) envelope.cloneNode(true);
      append(body(document), "x");
      header(document).insertBefore(aside(copy), header(document).getFirstChild());
      return true;
    });
  }

  private static Element header(Document document) {
    return Xml.child(document.getDocumentElement(), document.getDocumentElement().getNamespaceURI(), "Header");
  }

  private static Element body(Document document) {
    return Xml.child(document.getDocumentElement(), document.getDocumentElement().getNamespaceURI(), "Body");
  }

  private static Element token(Element security) {
    return Xml.child(security, Xml.SAML, "Assertion");
  }

  private static Element timestamp(Element security) {
    return Xml.child(security, Xml.WSU, "Timestamp");
  }

  /** The signature by the token's key: the first one, or the one that refers to the token. */
  private static Element signature(Element security) {
    String identifier = token(security).getAttribute("ID");
    Element first = null;
    for (Node child = security.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element && element.getLocalName().equals("Signature")) {
        first = first == null ? element : first;
        if (Xml.child(element, Xml.DS, "KeyInfo").getTextContent().contains(identifier)) {
          return element;
        }
      }
    }
    return first;
  }

  /** The reference of that signature to an element. */
  private static Node reference(Element security, Element target) {
    Element signedInfo = Xml.child(signature(security), Xml.DS, "SignedInfo");
    for (Node child = signedInfo.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element
        && element.getAttribute("URI").equals("#" + target.getAttributeNS(Xml.WSU, "Id"))) {
        return element;
      }
    }
    throw new IllegalArgumentException("no reference to " + target.getNodeName());
  }

  private static boolean replaceInKeyInfo(Element security, String old, String replacement) throws Exception {
    Element keyInfo = Xml.child(signature(security), Xml.DS, "KeyInfo");
    String text = Xml.write(keyInfo);
    Node changed = security.getOwnerDocument().importNode(
      Xml.parse(text.replace(old, replacement)).getDocumentElement(), true);
    keyInfo.getParentNode().replaceChild(changed, keyInfo);
    return text.contains(old);
  }

  private static Element renamed(Element element) {
    Element copy = (Element) element.cloneNode(true);
    copy.setAttributeNS(Xml.WSU, "wsu:Id", NEW_ID);
    return copy;
  }

  private static Element aside(Element element) {
    Element aside = element.getOwnerDocument().createElementNS("urn:aside", "aside");
    aside.appendChild(element);
    return aside;
  }

  private static boolean append(Element element, String text) {
    if (element != null) {
      element.appendChild(element.getOwnerDocument().createTextNode(text));
    }
    return element != null;
  }

  private static boolean setText(Element element, String text) {
    element.setTextContent(text);
    return true;
  }

  private static boolean changeBase64(Element element) {
    byte[] octets = Base64.getMimeDecoder().decode(element.getTextContent());
    octets[octets.length / 2] ^= 1;
    return setText(element, Base64.getEncoder().encodeToString(octets));
  }

  private static boolean setAlgorithm(Element security, String name, String algorithm) {
    Xml.find(signature(security), Xml.DS, name).setAttribute("Algorithm", algorithm);
    return true;
  }

  private static boolean remove(Node node) {
    node.getParentNode().removeChild(node);
    return true;
  }
}
