// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.ByteArrayInputStream;
import java.io.IOException;
import java.io.StringWriter;
import java.nio.charset.StandardCharsets;
import javax.xml.XMLConstants;
import javax.xml.parsers.DocumentBuilderFactory;
import javax.xml.parsers.ParserConfigurationException;
import javax.xml.transform.OutputKeys;
import javax.xml.transform.Transformer;
import javax.xml.transform.TransformerException;
import javax.xml.transform.TransformerFactory;
import javax.xml.transform.dom.DOMSource;
import javax.xml.transform.stream.StreamResult;
import org.w3c.dom.Document;
import org.w3c.dom.Element;
import org.w3c.dom.Node;
import org.xml.sax.SAXException;

/** XML as text and as a tree. */
final class Xml {
  static final String SOAP = "http://schemas.xmlsoap.org/soap/envelope/";
  static final String SOAP12 = "http://www.w3.org/2003/05/soap-envelope";
  static final String WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
  static final String WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
  static final String DS = "http://www.w3.org/2000/09/xmldsig#";
  static final String SAML = "urn:oasis:names:tc:SAML:2.0:assertion";
  static final String WSA = "http://www.w3.org/2005/08/addressing";

  private Xml() {
  }

  static Document parse(String text) throws SAXException, IOException, ParserConfigurationException {
    DocumentBuilderFactory factory = DocumentBuilderFactory.newInstance();
    factory.setNamespaceAware(true);
    factory.setFeature(XMLConstants.FEATURE_SECURE_PROCESSING, true);
    factory.setFeature("http://apache.org/xml/features/disallow-doctype-decl", true);
    return factory.newDocumentBuilder().parse(new ByteArrayInputStream(text.getBytes(StandardCharsets.UTF_8)));
  }

  static String write(Node node) throws TransformerException {
    Transformer transformer = TransformerFactory.newInstance().newTransformer();
    transformer.setOutputProperty(OutputKeys.OMIT_XML_DECLARATION, "yes");
    StringWriter writer = new StringWriter();
    transformer.transform(new DOMSource(node), new StreamResult(writer));
    return writer.toString();
  }

  /** The first element of that name below a node; null if there is none. */
  static Element find(Node root, String namespace, String name) {
    for (Node child = root.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element) {
        if (namespace.equals(element.getNamespaceURI()) && name.equals(element.getLocalName())) {
          return element;
        }
        Element found = find(element, namespace, name);
        if (found != null) {
          return found;
        }
      }
    }
    return null;
  }

  /** The child element of that name; null if there is none. */
  static Element child(Node parent, String namespace, String name) {
    for (Node child = parent.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element && namespace.equals(element.getNamespaceURI())
        && name.equals(element.getLocalName())) {
        return element;
      }
    }
    return null;
  }
}
