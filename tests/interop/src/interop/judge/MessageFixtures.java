// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.nio.file.Files;
import java.nio.file.Path;
import java.time.Instant;
import java.util.LinkedHashMap;
import java.util.Map;
import org.apache.wss4j.common.saml.OpenSAMLUtil;
import org.apache.wss4j.dom.engine.WSSConfig;
import org.joda.time.DateTimeUtils;

/**
 * Writes the messages that the unit tests verify, as if it was 2026-01-02T03:04:00Z.
 *
 * usage: MessageFixtures DATA OUT
 * DATA is the folder tests/data, with the keys and a token; OUT is the folder for the messages.
 */
public final class MessageFixtures {
  private static final Instant NOW = Instant.parse("2026-01-02T03:04:00Z");

  private MessageFixtures() {
  }

  /** Writes all messages, and expected.tsv. */
  public static void main(String[] arguments) throws Exception {
    if (arguments.length != 2) {
      System.err.println("usage: MessageFixtures DATA OUT");
      System.exit(2);
    }
    Path data = Path.of(arguments[0]);
    Path out = Path.of(arguments[1]);
    OpenSAMLUtil.initSamlEngine();
    WSSConfig.init();
    DateTimeUtils.setCurrentMillisFixed(NOW.toEpochMilli());
    Map<String, Identity> curves = new LinkedHashMap<>();
    for (String size : new String[] {"256", "384", "521"}) {
      curves.put(size, identity(data, "crypto/p" + size));
    }
    Identity holder = identity(data, "tokens/holder");
    Map<String, MessageMaker.Token> tokens = MessageTokens.make(identity(data, "tokens/sts-rsa"), holder, curves);
    tokens.put("strict", new MessageMaker.Token(Files.readString(data.resolve("tokens/holder-of-key.xml")), holder));
    MessageMaker maker = new MessageMaker(tokens, identity(data, "tokens/other"), NOW);
    XmlsecJudge judge = new XmlsecJudge(out);
    StringBuilder expected = new StringBuilder("# file\tprofile\tproof\trole\tcovered\trefusal\n");
    for (MessageKinds.Kind kind : MessageKinds.ofWss4j()) {
      String message = maker.make(kind);
      Files.writeString(out.resolve(kind.name() + ".xml"), message);
      if (xmlsec1Reads(kind)
        && !judge.judge(message, maker.token(kind).holder().certificate()).equals(XmlsecJudge.VERIFIES)) {
        throw new IllegalStateException("xmlsec1 refuses " + kind.name());
      }
      expected.append(String.join("\t", kind.name() + ".xml", kind.token().equals("strict") ? "strict" : "saml2",
        kind.isSigned() ? "message-signature" : "bearer", orDash(kind.role()),
        kind.isSigned() ? String.join(" ", MessageMaker.covered(kind)) : "-", orDash(kind.refusal()))).append('\n');
    }
    Files.writeString(out.resolve("expected.tsv"), expected.toString());
  }

  /** xmlsec1 1.2.37 has neither RSA-PSS nor the transform of WS-Security. */
  private static boolean xmlsec1Reads(MessageKinds.Kind kind) {
    return kind.isSigned() && kind.extra() != MessageKinds.Extra.OTHER_KEY
      && !kind.algorithm().equals(MessageKinds.RSA_PSS_SHA256)
      && !kind.refusal().equals(MessageKinds.TRANSFORM);
  }

  private static Identity identity(Path data, String name) throws Exception {
    return Identity.load(data.resolve(name + ".key"), data.resolve(name + ".crt"));
  }

  private static String orDash(String text) {
    return text.isEmpty() ? "-" : text;
  }
}
