// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.nio.file.Files;
import java.nio.file.Path;
import java.security.cert.X509Certificate;
import java.util.ArrayList;
import java.util.List;
import java.util.Map;
import java.util.regex.Matcher;
import java.util.regex.Pattern;

/** Judges tokens in both directions: Santuario and OpenSAML read our tokens, and the tool reads tokens of other makers. */
final class TokenJudgement {
  private static final String DIGESTS = "http://www.w3.org/2001/04/xmlenc#";
  private static final String MORE = "http://www.w3.org/2001/04/xmldsig-more#";
  private static final String NEWER = "http://www.w3.org/2007/05/xmldsig-more#";
  private static final String TEXT = "\"((?:[^\"\\\\]|\\\\.)*)\"";
  private static final Pattern SUBJECT = Pattern.compile(
    "\"subject\": ?\\{\\s*\"name\": ?" + TEXT + ",\\s*\"domain\": ?" + TEXT);
  private static final Pattern MESSAGE = Pattern.compile("\"message\": ?" + TEXT);
  private static final Pattern INSTANT = Pattern.compile("\\d{4}-\\d\\d-\\d\\dT[0-9:.]+Z");
  private static final int TOKEN_INVALID = 5;
  private static final int SIGNATURE_INVALID = 6;

  private final Verdicts verdicts;
  private final Path tool;
  private final Path folder;

  TokenJudgement(Verdicts verdicts, Path tool, Path folder) {
    this.verdicts = verdicts;
    this.tool = tool;
    this.folder = folder;
  }

  /** The tokens of the development service. */
  void judgeIssued(Map<String, String> tokens, X509Certificate signing) throws Exception {
    verdicts.title("Tokens of the development service, judged by Santuario and OpenSAML", "Token", "Santuario",
      "OpenSAML", "Changed copies refused");
    for (Map.Entry<String, String> token : tokens.entrySet()) {
      judgeByOthers(token.getKey(), token.getValue(), signing);
    }
  }

  /** Tokens of another service, each with the service's certificate: both judges and the tool. */
  void judgeForeign(Map<Path, Path> certificates) throws Exception {
    verdicts.title("Tokens of CXF, judged by Santuario, OpenSAML and `ssoclient verify --profile saml2`", "Token",
      "Santuario", "OpenSAML", "Changed copies refused", "`ssoclient verify`", "Changed copies refused by it");
    for (Map.Entry<Path, Path> one : certificates.entrySet()) {
      String name = one.getKey().getFileName().toString().replace(".xml", "");
      String token = Files.readString(one.getKey());
      Command.Outcome outcome = verify(token, one.getValue());
      String cell = verdicts.check(name + ", tool", "exit status 0", outcome.summary());
      judgeByOthers(name, token, Identity.certificate(one.getValue()),
        cell.equals("exit status 0") ? "accepted" : cell, judgeChanged(name, token, one.getValue()));
    }
  }

  /** Tokens that OpenSAML and Santuario make. */
  void judgeMade() throws Exception {
    Identity issuer = Identity.make(folder, "issuer", "rsa:2048");
    Identity curveHolder = curve("holder-ec", "P-256");
    Identity holder = Identity.make(folder, "holder", "rsa:2048");
    verdicts.title("Tokens made by OpenSAML, judged by `ssoclient verify --profile saml2`", "Token",
      "Schema of SAML 2.0", "Santuario", "`ssoclient verify`", "Changed copies refused");
    for (TokenKinds.Kind kind : new TokenKinds(holder.certificate(), curveHolder.certificate()).all()) {
      judgeKind(kind, issuer);
    }
    verdicts.title("Signatures made by Santuario, judged by `ssoclient verify --profile saml2`", "Signature",
      "`ssoclient verify`", "Changed copies refused");
    for (String size : new String[] {"256", "384", "512"}) {
      String digest = size.equals("384") ? MORE + "sha384" : DIGESTS + "sha" + size;
      judgeSignature("RSA, SHA-" + size, MORE + "rsa-sha" + size, digest, issuer);
      judgeSignature("RSA-PSS, SHA-" + size, NEWER + "sha" + size + "-rsa-MGF1", digest, issuer);
      String name = size.equals("512") ? "P-521" : "P-" + size;
      judgeSignature("ECDSA, " + name + ", SHA-" + size, MORE + "ecdsa-sha" + size, digest, curve("ec" + size, name));
    }
  }

  private Identity curve(String name, String curve) throws Exception {
    return Identity.make(folder, name, "ec", "-pkeyopt", "ec_paramgen_curve:" + curve);
  }

  private void judgeByOthers(String name, String token, X509Certificate signing, String... further)
    throws Exception {
    String bySantuario = verdicts.check(name + ", Santuario", TokenJudge.VERIFIES,
      TokenJudge.bySantuario(token, signing));
    String byOpenSaml = verdicts.check(name + ", OpenSAML", TokenJudge.VERIFIES,
      TokenJudge.byOpenSaml(token, signing));
    int refused = 0;
    Map<String, String> copies = TokenMaker.changedCopies(token);
    for (Map.Entry<String, String> copy : copies.entrySet()) {
      String subject = name + ", changed: " + copy.getKey();
      String first = TokenJudge.bySantuario(copy.getValue(), signing);
      String second = TokenJudge.byOpenSaml(copy.getValue(), signing);
      verdicts.check(subject + ", Santuario", TokenJudge.REFUSED, first);
      verdicts.check(subject + ", OpenSAML", TokenJudge.REFUSED, second);
      refused += first.equals(TokenJudge.REFUSED) && second.equals(TokenJudge.REFUSED) ? 1 : 0;
    }
    List<Object> cells = new ArrayList<>(List.of(name, bySantuario, byOpenSaml, refused + " of " + copies.size()));
    cells.addAll(List.of(further));
    verdicts.row(cells.toArray());
  }

  private void judgeKind(TokenKinds.Kind kind, Identity issuer) throws Exception {
    String token = TokenMaker.signByOpenSaml(kind, issuer);
    String bySantuario = verdicts.check(kind.name() + ", Santuario", TokenJudge.VERIFIES,
      TokenJudge.bySantuario(token, issuer.certificate()));
    Command.Outcome outcome = verify(token, issuer.certificateFile());
    String schema = TokenJudge.bySchema(token);
    if (kind.refusal() != null) {
      String found = outcome.status() == TOKEN_INVALID && outcome.errors().contains(kind.refusal())
        ? TokenJudge.REFUSED : outcome.summary();
      String cell = verdicts.check(kind.name(), TokenJudge.REFUSED, found);
      verdicts.row(kind.name(), schema, bySantuario, cell + ": " + reason(outcome), "");
      return;
    }
    String expected = kind.subject() + " of " + kind.domain();
    String found = outcome.status() == 0 ? subject(outcome.output()) : outcome.summary();
    String cell = verdicts.check(kind.name(), expected, found);
    verdicts.check(kind.name() + ", schema", "valid", schema);
    verdicts.row(kind.name(), schema, bySantuario, cell, judgeChanged(kind.name(), token, issuer.certificateFile()));
  }

  private void judgeSignature(String name, String method, String digest, Identity issuer) throws Exception {
    String token = TokenMaker.signBySantuario(SamlObjects.typedAssertion(), method, digest, issuer);
    Command.Outcome outcome = verify(token, issuer.certificateFile());
    String cell = verdicts.check(name, "exit status 0", outcome.summary());
    verdicts.row(name, cell.equals("exit status 0") ? "accepted" : cell,
      judgeChanged(name, token, issuer.certificateFile()));
  }

  /** A change after signing must end with the exit status for a wrong signature, and not with another refusal. */
  private String judgeChanged(String name, String token, Path certificate) throws Exception {
    int refused = 0;
    Map<String, String> copies = TokenMaker.changedCopies(token);
    for (Map.Entry<String, String> copy : copies.entrySet()) {
      Command.Outcome outcome = verify(copy.getValue(), certificate);
      verdicts.check(name + ", changed: " + copy.getKey(), "exit status " + SIGNATURE_INVALID,
        "exit status " + outcome.status());
      refused += outcome.status() == SIGNATURE_INVALID ? 1 : 0;
    }
    return refused + " of " + copies.size();
  }

  private Command.Outcome verify(String token, Path certificate) throws Exception {
    Path file = folder.resolve("token.xml");
    Files.writeString(file, token);
    List<String> command = new ArrayList<>(List.of(tool.toString(), "verify", "--profile", "saml2", "--trust",
      certificate.toString(), "--format", "json", file.toString()));
    return Command.run(folder, command);
  }

  private static String subject(String json) {
    Matcher matcher = SUBJECT.matcher(json);
    return matcher.find() ? unescape(matcher.group(1)) + " of " + unescape(matcher.group(2)) : "no subject";
  }

  private static String unescape(String json) {
    return Pattern.compile("\\\\(u([0-9a-f]{4})|.)").matcher(json).replaceAll(match -> Matcher.quoteReplacement(
      match.group(2) == null ? match.group(1) : String.valueOf((char) Integer.parseInt(match.group(2), 16))));
  }

  /** The message in the error's JSON. Instants differ from run to run, so they are left out. */
  private static String reason(Command.Outcome outcome) {
    Matcher matcher = MESSAGE.matcher(outcome.errors());
    String text = matcher.find() ? unescape(matcher.group(1)) : outcome.summary();
    return INSTANT.matcher(text).replaceAll("…");
  }
}
