// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.cert.X509Certificate;
import java.util.List;
import java.util.Map;

/** Shows that the judges can disagree: each wrong expectation must be noticed. */
final class SelfCheck {
  private SelfCheck() {
  }

  /** The same for messages with tokens. */
  static int runMessages(MessageJudge judge, MessageJudgement messages, XmlsecJudge xmlsec, X509Certificate signing)
    throws Exception {
    Verdicts verdicts = new Verdicts();
    MessageKinds.Kind kind = MessageKinds.ofTool().get(0);
    String message = messages.sign(kind);
    MessageJudge.Expected expected = MessageJudge.Expected.of(kind);
    MessageJudge.Expected more = new MessageJudge.Expected("", List.of("Timestamp", "Priority", "Body"), 0, true);
    verdicts.check("a message expected to have a signed header", EnvelopeJudge.VERIFIES,
      judge.judgeAsTree(message, more));
    verdicts.check("the same, stream engine", EnvelopeJudge.VERIFIES, judge.judgeAsStream(message, more));
    verdicts.check("a message expected to be for another role", EnvelopeJudge.VERIFIES, judge.judgeAsTree(message,
      new MessageJudge.Expected("urn:other", expected.covered(), 0, true)));
    verdicts.check("a message expected to be unsigned", EnvelopeJudge.VERIFIES, judge.judgeAsTree(message,
      new MessageJudge.Expected("", List.of(), 0, true)));
    verdicts.check("a message by another key, xmlsec1", XmlsecJudge.VERIFIES, xmlsec.judge(message, signing));
    verdicts.check("a message that verifies", TokenJudge.REFUSED, judge.judgeAsTree(message, expected));
    return allNoticed(verdicts);
  }

  /** Returns how many wrong expectations were noticed. @throws IllegalStateException if one was not. */
  static int run(EnvelopeJudge judge, String signedRequest, Map<String, String> tokens, X509Certificate signing)
    throws Exception {
    Verdicts verdicts = new Verdicts();
    String token = tokens.values().iterator().next();
    String changed = TokenMaker.changedCopies(token).get("NameID");
    verdicts.check("a signed request expected to be unsigned", EnvelopeJudge.VERIFIES,
      judge.judgeAsTree(signedRequest, new EnvelopeJudge.Expected(false, false, false)));
    verdicts.check("the same, stream engine", EnvelopeJudge.VERIFIES,
      judge.judgeAsStream(signedRequest, new EnvelopeJudge.Expected(false, false, false)));
    verdicts.check("a request expected to have a user name", EnvelopeJudge.VERIFIES,
      judge.judgeAsTree(signedRequest, new EnvelopeJudge.Expected(true, true, false)));
    verdicts.check("a changed token, Santuario", TokenJudge.VERIFIES, TokenJudge.bySantuario(changed, signing));
    verdicts.check("a changed token, OpenSAML", TokenJudge.VERIFIES, TokenJudge.byOpenSaml(changed, signing));
    verdicts.check("a token that verifies", TokenJudge.REFUSED, TokenJudge.bySantuario(token, signing));
    return allNoticed(verdicts);
  }

  private static int allNoticed(Verdicts verdicts) {
    if (verdicts.disagreements().size() != verdicts.size()) {
      throw new IllegalStateException("a wrong expectation was not noticed; noticed: " + verdicts.disagreements());
    }
    return verdicts.size();
  }
}
