// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.security.cert.X509Certificate;
import java.util.Map;

/** Shows that the judges can disagree: each wrong expectation must be noticed. */
final class SelfCheck {
  private SelfCheck() {
  }

  /** Returns how many wrong expectations were noticed. @throws IllegalStateException if one was not. */
  static int run(EnvelopeJudge judge, String signedRequest, Map<String, String> tokens, X509Certificate signing)
    throws Exception {
    Verdicts verdicts = new Verdicts();
    String token = tokens.values().iterator().next();
    String changed = TokenMaker.changedCopies(token).get("NameID");
    int wrong = 0;
    verdicts.check("a signed request expected to be unsigned", EnvelopeJudge.VERIFIES,
      judge.judgeAsTree(signedRequest, new EnvelopeJudge.Expected(false, false, false)));
    ++wrong;
    verdicts.check("the same, stream engine", EnvelopeJudge.VERIFIES,
      judge.judgeAsStream(signedRequest, new EnvelopeJudge.Expected(false, false, false)));
    ++wrong;
    verdicts.check("a request expected to have a user name", EnvelopeJudge.VERIFIES,
      judge.judgeAsTree(signedRequest, new EnvelopeJudge.Expected(true, true, false)));
    ++wrong;
    verdicts.check("a changed token, Santuario", TokenJudge.VERIFIES, TokenJudge.bySantuario(changed, signing));
    ++wrong;
    verdicts.check("a changed token, OpenSAML", TokenJudge.VERIFIES, TokenJudge.byOpenSaml(changed, signing));
    ++wrong;
    verdicts.check("a token that verifies", TokenJudge.REFUSED, TokenJudge.bySantuario(token, signing));
    ++wrong;
    if (verdicts.disagreements().size() != wrong) {
      throw new IllegalStateException("a wrong expectation was not noticed; noticed: " + verdicts.disagreements());
    }
    return wrong;
  }
}
