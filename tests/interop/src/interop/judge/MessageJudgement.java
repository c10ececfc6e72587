// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.List;
import java.util.Locale;
import java.util.Map;
import java.util.concurrent.ExecutorService;
import java.util.concurrent.Executors;
import java.util.concurrent.Future;

/** Judges messages with tokens: WSS4J and xmlsec1 verify the tool's messages, and the tool verifies WSS4J's. */
final class MessageJudgement {
  private interface Judgement {
    void judge(MessageKinds.Kind kind, Verdicts verdicts, Path folder) throws Exception;
  }

  private static final String SUCCESS = "exit status 0";
  private static final int NOT_ACCEPTED = 5;
  private static final int SIGNATURE_INVALID = 6;

  private final Verdicts verdicts;
  private final MessageJudge judge;
  private final MessageMaker maker;
  private final Map<String, Path> issuers;
  private final Path tool;
  private final Path folder;

  /** `issuers` has the certificate of each token's service, under the name of the token. */
  MessageJudgement(Verdicts verdicts, MessageJudge judge, MessageMaker maker, Map<String, Path> issuers, Path tool,
    Path folder) {
    this.verdicts = verdicts;
    this.judge = judge;
    this.maker = maker;
    this.issuers = issuers;
    this.tool = tool;
    this.folder = folder;
  }

  void run() throws Exception {
    judgeAllOurs();
    judgeAllTheirs();
  }

  void judgeAllOurs() throws Exception {
    verdicts.title("Messages that `ssoclient sign` made, judged by WSS4J and xmlsec1", "Message", "Tree engine",
      "Stream engine", "xmlsec1", "`ssoclient check-message`", "Changed copies refused by WSS4J", "By the tool");
    judgeAll(MessageKinds.ofTool(), this::judgeOurs);
  }

  void judgeAllTheirs() throws Exception {
    verdicts.title("Messages that WSS4J made, judged by `ssoclient check-message`", "Message", "Key in the message",
      "`ssoclient check-message`", "Changed copies refused");
    judgeAll(MessageKinds.ofWss4j(), this::judgeTheirs);
  }

  /** A message that the tool signed. @throws IllegalStateException if it does not sign */
  String sign(MessageKinds.Kind kind) throws Exception {
    Path input = Files.createTempFile(folder, "envelope", ".xml");
    Files.writeString(input, kind.extra() == MessageKinds.Extra.OTHER_SIGNATURE ? maker.withOtherSignature(kind)
      : MessageMaker.plain(kind.soap(), kind.hasAddressing()));
    Path token = Files.createTempFile(folder, "token", ".xml");
    Files.writeString(token, maker.token(kind).xml());
    List<String> command = new ArrayList<>(List.of(tool.toString(), "sign", "--token", token.toString(), "--trust",
      issuers.get(kind.token()).toString(), "--profile", "saml2"));
    if (kind.form() != MessageKinds.KeyForm.KEY_IDENTIFIER_OTHER_TYPE) {
      command.addAll(List.of("--token-type-reference", "standard"));
    }
    if (kind.isSigned()) {
      command.addAll(List.of("--key", maker.token(kind).holder().keyFile().toString()));
    }
    addRoleAndParts(command, kind);
    command.add(input.toString());
    Command.Outcome outcome = Command.run(folder, command);
    if (!outcome.succeeded()) {
      throw new IllegalStateException(kind.name() + ": " + outcome.summary());
    }
    return outcome.output();
  }

  /** Judges all kinds, several at once, and adds the rows in their order. */
  private void judgeAll(List<MessageKinds.Kind> kinds, Judgement judgement) throws Exception {
    ExecutorService threads = Executors.newFixedThreadPool(Runtime.getRuntime().availableProcessors());
    try {
      List<Future<Verdicts>> rows = new ArrayList<>();
      for (MessageKinds.Kind kind : kinds) {
        rows.add(threads.submit(() -> {
          Verdicts row = new Verdicts();
          judgement.judge(kind, row, Files.createTempDirectory(folder, kind.name()));
          return row;
        }));
      }
      for (Future<Verdicts> row : rows) {
        verdicts.add(row.get());
      }
    } finally {
      threads.shutdownNow();
    }
  }

  private void judgeOurs(MessageKinds.Kind kind, Verdicts row, Path work) throws Exception {
    String message = sign(kind);
    MessageJudge.Expected expected = MessageJudge.Expected.of(kind);
    String name = "ours, " + kind.name();
    String asTree = row.check(name + ", tree engine", EnvelopeJudge.VERIFIES, judge.judgeAsTree(message, expected));
    String asStream = row.check(name + ", stream engine", EnvelopeJudge.VERIFIES,
      judge.judgeAsStream(message, expected));
    String byXmlsec = kind.isSigned() ? row.check(name + ", xmlsec1", XmlsecJudge.VERIFIES,
      new XmlsecJudge(work).judge(message, maker.token(kind).holder().certificate())) : "not signed";
    String byTool = row.check(name + ", tool", SUCCESS, check(kind, message, work).summary());
    // Without this, it could be the writing of the copies that is refused, and not the changes.
    String copied = Xml.write(Xml.parse(message));
    row.check(name + ", copied, tree engine", EnvelopeJudge.VERIFIES, judge.judgeAsTree(copied, expected));
    row.check(name + ", copied, tool", SUCCESS, check(kind, copied, work).summary());
    int refused = 0;
    int refusedByTool = 0;
    Map<String, String> copies = changedCopies(kind, message);
    for (Map.Entry<String, String> copy : copies.entrySet()) {
      String subject = name + ", changed: " + copy.getKey();
      String answer = judge.judgeAsTree(copy.getValue(), expected);
      boolean isRefused = !answer.equals(EnvelopeJudge.VERIFIES);
      row.check(subject + ", WSS4J", TokenJudge.REFUSED, isRefused ? TokenJudge.REFUSED : answer);
      refused += isRefused ? 1 : 0;
      refusedByTool += checkRefused(row, subject, check(kind, copy.getValue(), work));
    }
    row.row(kind.name(), asTree, asStream, byXmlsec, byTool.equals(SUCCESS) ? "accepted" : byTool,
      refused + " of " + copies.size(), refusedByTool + " of " + copies.size());
  }

  private void judgeTheirs(MessageKinds.Kind kind, Verdicts row, Path work) throws Exception {
    String message = maker.make(kind);
    String name = "WSS4J's, " + kind.name();
    String form = kind.form().toString().toLowerCase(Locale.ROOT).replace('_', ' ');
    Command.Outcome outcome = check(kind, message, work);
    if (!kind.refusal().isEmpty()) {
      checkRefused(row, name, outcome);
      String found = outcome.errors().contains(kind.refusal()) ? kind.refusal() : outcome.summary();
      row.row(kind.name(), form, "refused: " + row.check(name + ", reason", kind.refusal(), found), "");
      return;
    }
    String cell = row.check(name, SUCCESS, outcome.summary());
    int refused = 0;
    Map<String, String> copies = changedCopies(kind, message);
    for (Map.Entry<String, String> copy : copies.entrySet()) {
      refused += checkRefused(row, name + ", changed: " + copy.getKey(), check(kind, copy.getValue(), work));
    }
    row.row(kind.name(), form, cell.equals(SUCCESS) ? "accepted" : cell, refused + " of " + copies.size());
  }

  /** Changes with a token that the same service issued for another key. */
  private Map<String, String> changedCopies(MessageKinds.Kind kind, String message) throws Exception {
    String other = maker.token(kind.token().equals("strict") ? "other-strict" : "other").xml();
    return MessageChanges.of(message, kind.role(), kind.isSigned(), other);
  }

  /** The tool must refuse, and not fail for another reason. Returns 1 if it does. */
  private static int checkRefused(Verdicts row, String subject, Command.Outcome outcome) {
    boolean isRefused = outcome.status() == NOT_ACCEPTED || outcome.status() == SIGNATURE_INVALID;
    row.check(subject + ", tool", TokenJudge.REFUSED, isRefused ? TokenJudge.REFUSED : outcome.summary());
    return isRefused ? 1 : 0;
  }

  private Command.Outcome check(MessageKinds.Kind kind, String message, Path work) throws Exception {
    Path file = work.resolve("message.xml");
    Files.writeString(file, message);
    List<String> command = new ArrayList<>(List.of(tool.toString(), "check-message", "--trust",
      issuers.get(kind.token()).toString(), "--profile", "saml2"));
    if (!kind.isSigned()) {
      command.add("--allow-bearer");
    }
    addRoleAndParts(command, kind);
    command.add(file.toString());
    return Command.run(work, command);
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
