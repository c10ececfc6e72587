// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.ByteArrayInputStream;
import java.io.IOException;
import java.nio.charset.StandardCharsets;
import java.security.KeyStore;
import java.util.ArrayList;
import java.util.Collections;
import java.util.IdentityHashMap;
import java.util.List;
import java.util.Map;
import java.util.Set;
import java.util.TreeSet;
import java.util.stream.Collectors;
import javax.security.auth.callback.Callback;
import javax.security.auth.callback.CallbackHandler;
import javax.xml.namespace.QName;
import javax.xml.stream.XMLInputFactory;
import javax.xml.stream.XMLStreamReader;
import org.apache.wss4j.common.bsp.BSPRule;
import org.apache.wss4j.common.crypto.AlgorithmSuite;
import org.apache.wss4j.common.crypto.Merlin;
import org.apache.wss4j.common.ext.WSPasswordCallback;
import org.apache.wss4j.common.ext.WSSecurityException;
import org.apache.wss4j.dom.WSConstants;
import org.apache.wss4j.dom.WSDataRef;
import org.apache.wss4j.dom.engine.WSSConfig;
import org.apache.wss4j.dom.engine.WSSecurityEngine;
import org.apache.wss4j.dom.engine.WSSecurityEngineResult;
import org.apache.wss4j.dom.handler.RequestData;
import org.apache.wss4j.dom.handler.WSHandlerResult;
import org.apache.wss4j.stax.ext.WSSConstants;
import org.apache.wss4j.stax.ext.WSSSecurityProperties;
import org.apache.wss4j.stax.securityEvent.SignedPartSecurityEvent;
import org.apache.wss4j.stax.securityEvent.WSSecurityEventConstants;
import org.apache.wss4j.stax.setup.WSSec;
import org.apache.xml.security.stax.securityEvent.AbstractElementSecurityEvent;
import org.apache.xml.security.stax.securityEvent.SecurityEvent;
import org.apache.xml.security.stax.securityEvent.SignatureValueSecurityEvent;
import org.apache.xml.security.stax.securityEvent.SignedElementSecurityEvent;
import org.w3c.dom.Document;
import org.w3c.dom.Element;
import org.w3c.dom.Node;

/** Judges a request as a service does, with the two engines of WSS4J, and then checks what exactly is signed. */
final class EnvelopeJudge {
  static final String VERIFIES = "verifies";

  private static final String RSA_SHA256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
  private static final String SHA256 = "http://www.w3.org/2001/04/xmlenc#sha256";
  private static final String EXCLUSIVE = "http://www.w3.org/2001/10/xml-exc-c14n#";
  private static final String ENVELOPED = "http://www.w3.org/2000/09/xmldsig#enveloped-signature";
  private static final int SHORTEST_KEY = 2048;

  /** Whether a request must be signed, must have a user name, and must follow the Basic Security Profile. */
  record Expected(boolean isSigned, boolean hasUsername, boolean followsBasicSecurityProfile) {
  }

  private final Merlin trusted = new Merlin();
  private final Map<String, String> passwords;

  EnvelopeJudge(KeyStore trustedCertificates, Map<String, String> passwords) {
    trusted.setTrustStore(trustedCertificates);
    this.passwords = passwords;
  }

  /** Returns VERIFIES, or the reason for which the request does not verify. */
  String judgeAsTree(String envelope, Expected expected) {
    try {
      Document document = Xml.parse(envelope);
      WSHandlerResult result = new WSSecurityEngine().processSecurityHeader(document,
        requestData(trusted, passwordCallback(), expected.followsBasicSecurityProfile()));
      if (result == null) {
        return "no security header";
      }
      return checkResults(document, result, expected);
    } catch (WSSecurityException refusal) {
      return refusal.getMessage();
    } catch (Exception failure) {
      return failure.toString();
    }
  }

  /** Judges with the engine that reads a stream. */
  String judgeAsStream(String envelope, Expected expected) {
    try {
      WSSSecurityProperties properties = properties(trusted, expected.followsBasicSecurityProfile());
      properties.setCallbackHandler(passwordCallback());
      properties.setUsernameTokenPasswordType(WSSConstants.UsernameTokenPasswordType.PASSWORD_TEXT);
      List<SecurityEvent> events = events(envelope, properties);
      return checkEvents(events, Xml.parse(envelope), expected);
    } catch (Exception failure) {
      return failure.getMessage() == null ? failure.toString() : failure.getMessage();
    }
  }

  /** How strictly the stream engine judges every message. */
  static WSSSecurityProperties properties(Merlin trusted, boolean followsBasicSecurityProfile) throws Exception {
    WSSSecurityProperties properties = new WSSSecurityProperties();
    properties.setSignatureVerificationCrypto(trusted);
    properties.setRequireTimestampExpires(true);
    properties.setValidateSamlSubjectConfirmation(true);
    if (!followsBasicSecurityProfile) {
      properties.addIgnoreBSPRule(BSPRule.R6617);
    }
    return properties;
  }

  /** What the stream engine reports of a message that it accepts. */
  static List<SecurityEvent> events(String envelope, WSSSecurityProperties properties) throws Exception {
    List<SecurityEvent> events = new ArrayList<>();
    XMLStreamReader plain = XMLInputFactory.newInstance().createXMLStreamReader(
      new ByteArrayInputStream(envelope.getBytes(StandardCharsets.UTF_8)));
    XMLStreamReader reader = WSSec.getInboundWSSec(properties).processInMessage(plain, null, events::add);
    while (reader.hasNext()) {
      reader.next();
    }
    return events;
  }

  /** How strictly the tree engine judges every message. */
  static RequestData requestData(Merlin trusted, CallbackHandler passwords, boolean followsBasicSecurityProfile) {
    RequestData data = new RequestData();
    data.setWssConfig(WSSConfig.getNewInstance());
    data.setSigVerCrypto(trusted);
    data.setCallbackHandler(passwords);
    data.setDisableBSPEnforcement(!followsBasicSecurityProfile);
    data.setRequiredPasswordType(WSConstants.PASSWORD_TEXT);
    data.setRequireTimestampExpires(true);
    data.setValidateSamlSubjectConfirmation(true);
    AlgorithmSuite suite = new AlgorithmSuite();
    suite.addSignatureMethod(RSA_SHA256);
    suite.addDigestAlgorithm(SHA256);
    suite.addC14nAlgorithm(EXCLUSIVE);
    suite.addTransformAlgorithm(EXCLUSIVE);
    suite.addTransformAlgorithm(ENVELOPED);
    suite.setMinimumAsymmetricKeyLength(SHORTEST_KEY);
    data.setAlgorithmSuite(suite);
    data.setSamlAlgorithmSuite(suite);
    return data;
  }

  private CallbackHandler passwordCallback() {
    return callbacks -> {
      for (Callback callback : callbacks) {
        WSPasswordCallback request = (WSPasswordCallback) callback;
        request.setPassword(passwords.get(request.getIdentifier()));
      }
    };
  }

  /** The elements that must be signed. No other element may be signed. */
  private static Set<Element> mustBeSigned(Document document) {
    Set<Element> wanted = Collections.newSetFromMap(new IdentityHashMap<>());
    Element envelope = document.getDocumentElement();
    Element header = Xml.child(envelope, Xml.SOAP, "Header");
    wanted.add(Xml.child(envelope, Xml.SOAP, "Body"));
    wanted.add(Xml.child(Xml.child(header, Xml.WSSE, "Security"), Xml.WSU, "Timestamp"));
    for (Node child = header.getFirstChild(); child != null; child = child.getNextSibling()) {
      if (child instanceof Element element && Xml.WSA.equals(element.getNamespaceURI())) {
        wanted.add(element);
      }
    }
    return wanted;
  }

  private static String checkResults(Document document, WSHandlerResult result, Expected expected) {
    Map<Integer, List<WSSecurityEngineResult>> actions = result.getActionResults();
    if (actions.getOrDefault(WSConstants.TS, List.of()).size() != 1) {
      return "not exactly one timestamp";
    }
    if (actions.getOrDefault(WSConstants.UT, List.of()).size() != (expected.hasUsername() ? 1 : 0)) {
      return "not the expected username token";
    }
    List<WSSecurityEngineResult> signatures = actions.getOrDefault(WSConstants.SIGN, List.of());
    if (signatures.size() != (expected.isSigned() ? 1 : 0)) {
      return signatures.size() + " message signatures";
    }
    for (WSSecurityEngineResult signature : signatures) {
      String answer = checkSigned(signature, mustBeSigned(document));
      if (!answer.equals(VERIFIES)) {
        return answer;
      }
    }
    return VERIFIES;
  }

  /** Whether a signature covers exactly the wanted elements, by identity. */
  static String checkSigned(WSSecurityEngineResult signature, Set<Element> wanted) {
    Set<Element> signed = Collections.newSetFromMap(new IdentityHashMap<>());
    @SuppressWarnings("unchecked")
    List<WSDataRef> references = (List<WSDataRef>) signature.get(WSSecurityEngineResult.TAG_DATA_REF_URIS);
    for (WSDataRef reference : references) {
      signed.add(reference.getProtectedElement());
    }
    return references.size() == wanted.size() && signed.equals(wanted) ? VERIFIES
      : "other elements are signed: " + names(signed) + ", wanted: " + names(wanted);
  }

  private static String names(Set<Element> elements) {
    return elements.stream().map(Node::getNodeName).sorted().collect(Collectors.joining(" "));
  }

  private static String checkEvents(List<SecurityEvent> events, Document document, Expected expected) {
    boolean hasUsername = events.stream()
      .anyMatch(event -> event.getSecurityEventType() == WSSecurityEventConstants.USERNAME_TOKEN);
    if (hasUsername != expected.hasUsername()) {
      return "not the expected username token";
    }
    return checkSigned(events, expected.isSigned() ? mustBeSigned(document) : Set.of());
  }

  /** Whether exactly the wanted elements are signed, by their paths; if none is wanted, there is no signature. */
  static String checkSigned(List<SecurityEvent> events, Set<Element> wantedElements) {
    boolean hasSignature = false;
    Set<String> signed = new TreeSet<>();
    for (SecurityEvent event : events) {
      hasSignature = hasSignature || event instanceof SignatureValueSecurityEvent;
      boolean isPart = event instanceof SignedPartSecurityEvent part && part.isSigned();
      boolean isElement = event instanceof SignedElementSecurityEvent element && element.isSigned();
      if (isPart || isElement) {
        signed.add(path(((AbstractElementSecurityEvent) event).getElementPath()));
      }
    }
    if (wantedElements.isEmpty()) {
      return signed.isEmpty() ? VERIFIES : "signed: " + signed;
    }
    Set<String> wanted = new TreeSet<>();
    for (Element element : wantedElements) {
      wanted.add(path(element));
    }
    return hasSignature && signed.equals(wanted) ? VERIFIES
      : "other elements are signed: " + signed + ", wanted: " + wanted;
  }

  private static String path(List<QName> names) {
    return names.stream().map(QName::getLocalPart).collect(Collectors.joining("/"));
  }

  private static String path(Element element) {
    return element.getParentNode() instanceof Element parent ? path(parent) + "/" + element.getLocalName()
      : element.getLocalName();
  }
}
