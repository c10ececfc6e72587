// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.List;
import java.util.Locale;
import java.util.Map;

/** Judges messages with tokens in both directions: WSS4J and xmlsec1 verify the tool's, and the tool verifies WSS4J's. */
final class MessageJudgement {
  private static final int NOT_ACCEPTED = 5;
  private static final int SIGNATURE_INVALID = 6;

  private static final Map<String, String> REASONS = Map.of(MessageKinds.NO_PROOF,
    "the signature refers to a certificate, not to the token", MessageKinds.TRANSFORM,
    "the signature has a transform that the profile does not have");

  private final Verdicts verdicts;
  private final MessageJudge judge;
  private final XmlsecJudge xmlsec;
  private final MessageMaker maker;
  private final Map<String, Path> issuers;
  private final Path tool;
  private final Path folder;

  /** `issuers` has the certificate of each token's service, under the name of the token. */
  MessageJudgement(Verdicts verdicts, MessageJudge judge, MessageMaker maker, Map<String, Path> issuers, Path tool,
    Path folder) {
    this.verdicts = verdicts;
    this.judge = judge;
    this.xmlsec = new XmlsecJudge(folder);
    this.maker = maker;
    this.issuers = issuers;
    this.tool = tool;
    this.folder = folder;
  }

  void run() throws Exception {
    verdicts.title("Messages that `ssoclient sign` made, judged by WSS4J and xmlsec1", "Message", "Tree engine",
      "Stream engine", "xmlsec1", "`ssoclient check-message`", "Changed copies refused by WSS4J", "By the tool");
    for (MessageKinds.Kind kind : MessageKinds.ofTool()) {
      judgeOurs(kind);
    }
    verdicts.title("Messages that WSS4J made, judged by `ssoclient check-message`", "Message", "Key in the message",
      "`ssoclient check-message`", "Changed copies refused");
    for (MessageKinds.Kind kind : MessageKinds.ofWss4j()) {
      judgeTheirs(kind);
    }
  }

  /** A message that the tool signed. */
  String sign(MessageKinds.Kind kind) throws Exception {
    Path input = folder.resolve("envelope.xml");
    Path output = folder.resolve("signed.xml");
    Files.deleteIfExists(output);
    Files.writeString(input, kind.extra() == MessageKinds.Extra.OTHER_SIGNATURE ? maker.withOtherSignature(kind)
      : MessageMaker.plain(kind.soap(), kind.hasAddressing()));
    Path token = folder.resolve("message-token.xml");
    Files.writeString(token, maker.token(kind).xml());
    List<String> command = new ArrayList<>(List.of(tool.toString(), "sign", "--token", token.toString(), "--trust",
      issuers.get(kind.token()).toString(), "--profile", "saml2", "--out", output.toString()));
    if (kind.form() != MessageKinds.KeyForm.KEY_IDENTIFIER_OTHER_TYPE) {
      command.addAll(List.of("--token-type-reference", "standard"));
    }
    if (kind.isSigned()) {
      command.addAll(List.of("--key", maker.token(kind).holder().keyFile().toString()));
    }
    addRoleAndParts(command, kind);
    command.add(input.toString());
    Command.Outcome outcome = Command.run(folder, command);
    verdicts.check("sign " + kind.name(), "exit status 0", outcome.summary());
    return outcome.succeeded() ? Files.readString(output) : null;
  }

  private void judgeOurs(MessageKinds.Kind kind) throws Exception {
    String message = sign(kind);
    if (message == null) {
      return;
    }
    MessageJudge.Expected expected = MessageJudge.Expected.of(kind);
    String name = "ours, " + kind.name();
    String asTree = verdicts.check(name + ", tree engine", EnvelopeJudge.VERIFIES,
      judge.judgeAsTree(message, expected));
    String asStream = verdicts.check(name + ", stream engine", EnvelopeJudge.VERIFIES,
      judge.judgeAsStream(message, expected));
    String byXmlsec = kind.isSigned() ? verdicts.check(name + ", xmlsec1", XmlsecJudge.VERIFIES,
      xmlsec.judge(message, maker.token(kind).holder().certificate())) : "not signed";
    Command.Outcome outcome = check(kind, message);
    String byTool = verdicts.check(name + ", tool", "exit status 0", outcome.summary());
    int refused = 0;
    int refusedByTool = 0;
    Map<String, String> copies = changedCopies(kind, message);
    for (Map.Entry<String, String> copy : copies.entrySet()) {
      String answer = judge.judgeAsTree(copy.getValue(), expected);
      boolean isRefused = !answer.equals(EnvelopeJudge.VERIFIES);
      verdicts.check(name + ", changed: " + copy.getKey() + ", WSS4J", TokenJudge.REFUSED,
        isRefused ? TokenJudge.REFUSED : answer);
      refused += isRefused ? 1 : 0;
      refusedByTool += checkRefused(kind, name + ", changed: " + copy.getKey(), copy.getValue());
    }
    verdicts.row(kind.name(), asTree, asStream, byXmlsec, byTool.equals("exit status 0") ? "accepted" : byTool,
      refused + " of " + copies.size(), refusedByTool + " of " + copies.size());
  }

  private void judgeTheirs(MessageKinds.Kind kind) throws Exception {
    String message = maker.make(kind);
    String name = "WSS4J's, " + kind.name();
    String form = kind.form().toString().toLowerCase(Locale.ROOT).replace('_', ' ');
    if (!kind.refusal().isEmpty()) {
      int refused = checkRefused(kind, name, message);
      verdicts.row(kind.name(), form, refused == 1 ? "refused: " + REASONS.get(kind.refusal()) : "**accepted**", "");
      return;
    }
    Command.Outcome outcome = check(kind, message);
    String cell = verdicts.check(name, "exit status 0", outcome.summary());
    int refused = 0;
    Map<String, String> copies = changedCopies(kind, message);
    for (Map.Entry<String, String> copy : copies.entrySet()) {
      refused += checkRefused(kind, name + ", changed: " + copy.getKey(), copy.getValue());
    }
    verdicts.row(kind.name(), form, cell.equals("exit status 0") ? "accepted" : cell, refused + " of " + copies.size());
  }

  /** Changes with a token that the same service issued for another key. */
  private Map<String, String> changedCopies(MessageKinds.Kind kind, String message) throws Exception {
    String other = maker.token(kind.token().equals("strict") ? "other-strict" : "other").xml();
    return MessageChanges.of(message, kind.role(), kind.isSigned(), other);
  }

  /** The tool must refuse, and not fail for another reason. Returns 1 if it does. */
  private int checkRefused(MessageKinds.Kind kind, String subject, String message) throws Exception {
    Command.Outcome outcome = check(kind, message);
    boolean isRefused = outcome.status() == NOT_ACCEPTED || outcome.status() == SIGNATURE_INVALID;
    verdicts.check(subject + ", tool", TokenJudge.REFUSED, isRefused ? TokenJudge.REFUSED : outcome.summary());
    return isRefused ? 1 : 0;
  }

  private Command.Outcome check(MessageKinds.Kind kind, String message) throws Exception {
    Path file = folder.resolve("message.xml");
    Files.writeString(file, message);
    List<String> command = new ArrayList<>(List.of(tool.toString(), "check-message", "--trust",
      issuers.get(kind.token()).toString(), "--profile", "saml2", "--format", "json"));
    if (!kind.isSigned()) {
      command.add("--allow-bearer");
    }
    addRoleAndParts(command, kind);
    command.add(file.toString());
    return Command.run(folder, command);
  }

  private static void addRoleAndParts(List<String> command, MessageKinds.Kind kind) {
    if (!kind.role().isEmpty()) {
      command.addAll(List.of("--actor", kind.role()));
    }
    for (String part : MessageMaker.furtherParts(kind)) {
      command.addAll(List.of("--part", part));
    }
  }
}
