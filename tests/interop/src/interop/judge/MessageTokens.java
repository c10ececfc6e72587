// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.PublicKey;
import java.util.LinkedHashMap;
import java.util.Map;
import java.util.function.Consumer;
import org.apache.xml.security.keys.content.KeyValue;
import org.opensaml.saml.saml2.core.Assertion;
import org.opensaml.saml.saml2.core.SubjectConfirmation;
import org.w3c.dom.Element;

/** Makes the tokens of the messages with OpenSAML: bound to a certificate, bound to a key value, and bearer tokens. */
final class MessageTokens {
  private MessageTokens() {
  }

  /** The tokens under their names. `curves` has an identity for each of the sizes 256, 384 and 521. */
  static Map<String, MessageMaker.Token> make(Identity issuer, Identity rsa, Map<String, Identity> curves)
    throws Exception {
    Map<String, MessageMaker.Token> tokens = new LinkedHashMap<>();
    tokens.put("rsa-certificate", boundToCertificate(issuer, rsa));
    tokens.put("rsa-key-value", boundToKey(issuer, rsa));
    for (Map.Entry<String, Identity> curve : curves.entrySet()) {
      tokens.put("ec" + curve.getKey() + "-certificate", boundToCertificate(issuer, curve.getValue()));
      tokens.put("ec" + curve.getKey() + "-key-value", boundToKey(issuer, curve.getValue()));
    }
    tokens.put("bearer", new MessageMaker.Token(sign(issuer, SamlObjects.bearer(), root -> { }), null));
    return tokens;
  }

  private static MessageMaker.Token boundToCertificate(Identity issuer, Identity holder) throws Exception {
    return new MessageMaker.Token(sign(issuer, SamlObjects.holderOfKey(holder.certificate(), null), root -> { }),
      holder);
  }

  /** Santuario writes key values of all kinds; OpenSAML writes none of curves. */
  private static MessageMaker.Token boundToKey(Identity issuer, Identity holder) throws Exception {
    PublicKey key = holder.certificate().getPublicKey();
    return new MessageMaker.Token(sign(issuer, SamlObjects.holderOfKey(null, null), root ->
      Xml.find(Xml.child(root, Xml.SAML, "Subject"), Xml.DS, "KeyInfo")
        .appendChild(new KeyValue(root.getOwnerDocument(), key).getElement())), holder);
  }

  private static String sign(Identity issuer, SubjectConfirmation confirmation, Consumer<Element> treeChange)
    throws Exception {
    Assertion assertion = SamlObjects.assertion();
    assertion.getSubject().getSubjectConfirmations().clear();
    assertion.getSubject().getSubjectConfirmations().add(confirmation);
    assertion.getAuthnStatements().add(SamlObjects.authentication());
    return TokenMaker.signWithCertificate(new TokenKinds.Kind("", assertion, treeChange, "", "", null), issuer);
  }
}
