// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.KeyStore;
import java.util.ArrayList;
import java.util.Collections;
import java.util.IdentityHashMap;
import java.util.List;
import java.util.Map;
import java.util.Set;
import org.apache.wss4j.common.bsp.BSPRule;
import org.apache.wss4j.common.crypto.AlgorithmSuite;
import org.apache.wss4j.common.crypto.Merlin;
import org.apache.wss4j.common.ext.WSSecurityException;
import org.apache.wss4j.dom.WSConstants;
import org.apache.wss4j.dom.engine.WSSecurityEngine;
import org.apache.wss4j.dom.engine.WSSecurityEngineResult;
import org.apache.wss4j.dom.handler.RequestData;
import org.apache.wss4j.dom.handler.WSHandlerResult;
import org.apache.wss4j.dom.saml.DOMSAMLUtil;
import org.apache.wss4j.stax.ext.WSSSecurityProperties;
import org.w3c.dom.Document;
import org.w3c.dom.Element;
import org.w3c.dom.Node;

/** Judges a message with a token as a service does, with both engines of WSS4J, and then checks what is signed. */
final class MessageJudge {
  /**
   * What a message must have. An empty `role` is that of the last receiver. `covered` has the local names of the
   * elements that are signed with the token's key, and of no other; it is empty for a bearer token. `others` is the
   * number of other signatures.
   */
  record Expected(String role, List<String> covered, int others, boolean followsBasicSecurityProfile) {
    /** Of a message that the tool makes. It always signs the token, too. */
    static Expected of(MessageKinds.Kind kind) {
      List<String> covered = new ArrayList<>();
      if (kind.isSigned()) {
        covered.add("Assertion");
        covered.addAll(MessageMaker.covered(kind));
      }
      return new Expected(kind.role(), covered, kind.extra() == MessageKinds.Extra.OTHER_SIGNATURE ? 1 : 0,
        kind.form() != MessageKinds.KeyForm.KEY_IDENTIFIER_OTHER_TYPE);
    }
  }

  private static final String ECDSA = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha";

  private static final int LONGEST_CURVE = 521;

  private final Merlin trusted = new Merlin();

  /** The trusted certificates are those of the token services; the holders' need not be there. */
  MessageJudge(KeyStore trustedCertificates) {
    trusted.setTrustStore(trustedCertificates);
  }

  /** Returns EnvelopeJudge.VERIFIES, or the reason for which the message does not verify. */
  String judgeAsTree(String message, Expected expected) {
    try {
      Document document = Xml.parse(message);
      RequestData data = EnvelopeJudge.requestData(trusted, callbacks -> { }, expected.followsBasicSecurityProfile());
      data.setActor(expected.role().isEmpty() ? null : expected.role());
      AlgorithmSuite suite = data.getAlgorithmSuite();
      List.of("256", "384", "512").forEach(size -> suite.addSignatureMethod(ECDSA + size));
      suite.setMaximumEllipticCurveKeyLength(LONGEST_CURVE);
      WSHandlerResult result = new WSSecurityEngine().processSecurityHeader(document, data);
      if (result == null) {
        return "no security header";
      }
      // Checks that the message is signed with the key of a holder-of-key token.
      DOMSAMLUtil.validateSAMLResults(result, null, body(document));
      return checkResults(document, result, expected);
    } catch (WSSecurityException refusal) {
      return refusal.getMessage();
    } catch (Exception failure) {
      return failure.toString();
    }
  }

  /** Judges with the engine that reads a stream. */
  String judgeAsStream(String message, Expected expected) {
    try {
      WSSSecurityProperties properties = EnvelopeJudge.properties(trusted, expected.followsBasicSecurityProfile());
      properties.setActor(expected.role().isEmpty() ? null : expected.role());
      // The rule is a recommendation, and older than signatures with curves.
      properties.addIgnoreBSPRule(BSPRule.R5421);
      return EnvelopeJudge.checkSigned(EnvelopeJudge.events(message, properties),
        wanted(Xml.parse(message), expected));
    } catch (Exception failure) {
      return failure.getMessage() == null ? failure.toString() : failure.getMessage();
    }
  }

  private static String checkResults(Document document, WSHandlerResult result, Expected expected) {
    Map<Integer, List<WSSecurityEngineResult>> actions = result.getActionResults();
    if (actions.getOrDefault(WSConstants.TS, List.of()).size() != 1) {
      return "not exactly one timestamp";
    }
    if (actions.getOrDefault(WSConstants.ST_SIGNED, List.of()).size() != 1
      || actions.containsKey(WSConstants.ST_UNSIGNED)) {
      return "not exactly one token, signed by its service";
    }
    List<WSSecurityEngineResult> signatures = actions.getOrDefault(WSConstants.SIGN, List.of());
    if (signatures.size() != (expected.covered().isEmpty() ? 0 : 1) + expected.others()) {
      return signatures.size() + " message signatures";
    }
    String answer = EnvelopeJudge.VERIFIES;
    for (WSSecurityEngineResult signature : signatures) {
      answer = EnvelopeJudge.checkSigned(signature, wanted(document, expected));
      if (answer.equals(EnvelopeJudge.VERIFIES)) {
        break;
      }
    }
    return answer;
  }

  /** The elements that a service reads, and which must be the signed ones. */
  private static Set<Element> wanted(Document document, Expected expected) {
    Set<Element> wanted = Collections.newSetFromMap(new IdentityHashMap<>());
    Element header = Xml.child(document.getDocumentElement(), soap(document), "Header");
    Element security = security(document, expected.role());
    for (String name : expected.covered()) {
      switch (name) {
        case "Body" -> wanted.add(body(document));
        case "Timestamp" -> wanted.add(Xml.child(security, Xml.WSU, name));
        case "Assertion" -> wanted.add(Xml.child(security, Xml.SAML, name));
        default -> wanted.add(childNamed(header, name));
      }
    }
    return wanted;
  }

  private static Element childNamed(Element parent, String name) {
    for (Node child = parent.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element && name.equals(element.getLocalName())) {
        return element;
      }
    }
    throw new IllegalArgumentException("no " + name);
  }

  private static String soap(Document document) {
    return document.getDocumentElement().getNamespaceURI();
  }

  private static Element body(Document document) {
    return Xml.child(document.getDocumentElement(), soap(document), "Body");
  }

  /** The first security header for a role; null if there is none. */
  static Element security(Document document, String role) {
    String attribute = soap(document).equals(Xml.SOAP12) ? "role" : "actor";
    Element header = Xml.child(document.getDocumentElement(), soap(document), "Header");
    for (Node child = header.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element && element.getLocalName().equals("Security")
        && element.getAttributeNS(soap(document), attribute).equals(role)) {
        return element;
      }
    }
    return null;
  }
}
