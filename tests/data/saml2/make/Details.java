// SPDX-License-Identifier: Apache-2.0
// Prints what OpenSAML reads in an assertion, one fact on each line. The tests compare our reader with it.

import java.security.MessageDigest;
import java.security.PublicKey;
import java.security.cert.X509Certificate;
import java.util.Base64;
import java.util.HexFormat;
import java.util.TreeSet;
import java.io.ByteArrayOutputStream;
import javax.xml.crypto.dom.DOMStructure;
import javax.xml.crypto.dsig.keyinfo.KeyInfoFactory;
import javax.xml.crypto.dsig.keyinfo.KeyValue;
import org.apache.xml.security.c14n.Canonicalizer;
import org.joda.time.DateTime;
import org.opensaml.core.xml.XMLObject;
import org.opensaml.saml.saml2.core.*;
import org.opensaml.xmlsec.keyinfo.KeyInfoSupport;
import org.opensaml.xmlsec.signature.KeyInfo;
import org.w3c.dom.Element;
import org.w3c.dom.Node;

final class Details {
  private final StringBuilder out = new StringBuilder();

  static String of(Assertion assertion) throws Exception {
    Details details = new Details();
    details.addAssertion(assertion);
    return details.out.toString();
  }

  private void addAssertion(Assertion assertion) throws Exception {
    out.append("issuer");
    addName(assertion.getIssuer());
    out.append("issued ").append(time(assertion.getIssueInstant())).append("\nsubject");
    addName(assertion.getSubject().getNameID());
    for (SubjectConfirmation confirmation : assertion.getSubject().getSubjectConfirmations()) {
      addConfirmation(confirmation);
    }
    addConditions(assertion.getConditions());
    for (AuthnStatement statement : assertion.getAuthnStatements()) {
      addAuthn(statement);
    }
    for (AttributeStatement statement : assertion.getAttributeStatements()) {
      for (Attribute attribute : statement.getAttributes()) {
        addAttribute(attribute);
      }
    }
  }

  private static String time(DateTime instant) {
    return instant.toInstant().toString();
  }

  private void addText(String label, String text) {
    if (text != null) {
      out.append(' ').append(label).append(" {").append(text).append('}');
    }
  }

  private void addTime(String label, DateTime instant) {
    if (instant != null) {
      out.append(' ').append(label).append(' ').append(time(instant));
    }
  }

  private void addName(NameIDType name) {
    addText("value", name.getValue());
    addText("format", ((XMLObject) name).getDOM().hasAttributeNS(null, "Format") ? name.getFormat() : null);
    addText("name-qualifier", name.getNameQualifier());
    addText("sp-name-qualifier", name.getSPNameQualifier());
    addText("sp-provided-id", name.getSPProvidedID());
    out.append('\n');
  }

  private void addConfirmation(SubjectConfirmation confirmation) throws Exception {
    out.append("confirmation {").append(confirmation.getMethod()).append('}');
    SubjectConfirmationData data = confirmation.getSubjectConfirmationData();
    if (data != null) {
      addTime("not-before", data.getNotBefore());
      addTime("not-on-or-after", data.getNotOnOrAfter());
      addText("recipient", data.getRecipient());
      addText("in-response-to", data.getInResponseTo());
      addText("address", data.getAddress());
      if (confirmation.getMethod().endsWith(":holder-of-key")) {
        addKeys(data);
      }
    }
    out.append('\n');
    if (confirmation.getNameID() != null) {
      out.append("confirmed-by");
      addName(confirmation.getNameID());
    }
  }

  private void addKeys(SubjectConfirmationData data) throws Exception {
    for (XMLObject child : data.getUnknownXMLObjects(KeyInfo.DEFAULT_ELEMENT_NAME)) {
      KeyInfo keyInfo = (KeyInfo) child;
      PublicKey key = null;
      for (X509Certificate certificate : KeyInfoSupport.getCertificates(keyInfo)) {
        byte[] thumbprint = MessageDigest.getInstance("SHA-256").digest(certificate.getEncoded());
        addText("certificate", HexFormat.of().formatHex(thumbprint));
        key = certificate.getPublicKey();
        break;
      }
      // Read by the JDK, because neither OpenSAML nor Santuario reads the values of EC keys.
      for (Object content : KeyInfoFactory.getInstance("DOM").unmarshalKeyInfo(new DOMStructure(keyInfo.getDOM())).getContent()) {
        key = content instanceof KeyValue ? ((KeyValue) content).getPublicKey() : key;
      }
      if (key != null) {
        addText("key", Base64.getEncoder().encodeToString(key.getEncoded()));
      }
    }
  }

  private void addConditions(Conditions conditions) {
    for (AudienceRestriction restriction : conditions.getAudienceRestrictions()) {
      out.append("audiences");
      addAudiences(restriction.getAudiences());
    }
    if (conditions.getOneTimeUse() != null) {
      out.append("one-time-use\n");
    }
    ProxyRestriction proxy = conditions.getProxyRestriction();
    if (proxy != null) {
      out.append("proxy");
      if (proxy.getDOM().hasAttributeNS(null, "Count")) {
        out.append(" count ").append(proxy.getProxyCount());
      }
      addAudiences(proxy.getAudiences());
    }
  }

  private void addAudiences(Iterable<Audience> audiences) {
    TreeSet<String> texts = new TreeSet<>();
    for (Audience audience : audiences) {
      texts.add(audience.getAudienceURI());
    }
    for (String text : texts) {
      out.append(" {").append(text).append('}');
    }
    out.append('\n');
  }

  private void addAuthn(AuthnStatement statement) {
    out.append("authn ").append(time(statement.getAuthnInstant()));
    addText("session-index", statement.getSessionIndex());
    addTime("session-end", statement.getSessionNotOnOrAfter());
    if (statement.getSubjectLocality() != null) {
      addText("address", statement.getSubjectLocality().getAddress());
      addText("dns-name", statement.getSubjectLocality().getDNSName());
    }
    AuthnContext context = statement.getAuthnContext();
    if (context.getAuthnContextClassRef() != null) {
      addText("class", context.getAuthnContextClassRef().getAuthnContextClassRef());
    }
    if (context.getAuthnContextDeclRef() != null) {
      addText("declaration", context.getAuthnContextDeclRef().getAuthnContextDeclRef());
    }
    for (AuthenticatingAuthority authority : context.getAuthenticatingAuthorities()) {
      addText("authority", authority.getURI());
    }
    out.append('\n');
  }

  private void addAttribute(Attribute attribute) throws Exception {
    out.append("attribute");
    addText("name", attribute.getName());
    addText("format", attribute.getDOM().hasAttributeNS(null, "NameFormat") ? attribute.getNameFormat() : null);
    addText("friendly-name", attribute.getFriendlyName());
    out.append('\n');
    for (XMLObject value : attribute.getAttributeValues()) {
      Element element = value.getDOM();
      String nil = element.getAttributeNS("http://www.w3.org/2001/XMLSchema-instance", "nil");
      boolean isNil = nil.equals("true") || nil.equals("1");
      boolean isXml = false;
      for (Node child = element.getFirstChild(); child != null; child = child.getNextSibling()) {
        isXml |= child.getNodeType() == Node.ELEMENT_NODE;
      }
      out.append(isNil ? "nil" : isXml ? "xml" : "text").append(" {");
      out.append(isXml ? canonical(element) : element.getTextContent()).append("}\n");
    }
  }

  private static String canonical(Element element) throws Exception {
    ByteArrayOutputStream octets = new ByteArrayOutputStream();
    Canonicalizer.getInstance(Canonicalizer.ALGO_ID_C14N_EXCL_OMIT_COMMENTS).canonicalizeSubtree(element, octets);
    return octets.toString("UTF-8");
  }
}
