// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.net.URI;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.Base64;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import javax.net.ssl.SSLContext;

/** Judges the requests of the tool: each operation in each dialect, and changed copies of the signed ones. */
final class RequestJudgement {
  /** An operation: what its request has, and the arguments of the tool. */
  private record Operation(String name, boolean isSigned, boolean hasUsername, List<String> arguments) {
  }

  private static final String DELEGABLE = "--delegable";
  private static final List<String> IDENTITY = List.of("--cert", "${cert}", "--key", "${key}");

  private final Verdicts verdicts;
  private final EnvelopeJudge judge;
  private final DevelopmentService service;
  private final SSLContext tls;
  private final Path tool;
  private final Path folder;
  private final Map<String, String> tokens = new LinkedHashMap<>();

  RequestJudgement(Verdicts verdicts, EnvelopeJudge judge, DevelopmentService service, SSLContext tls, Path tool,
    Path folder) {
    this.verdicts = verdicts;
    this.judge = judge;
    this.service = service;
    this.tls = tls;
    this.tool = tool;
    this.folder = folder;
  }

  /** The tokens that the service issued, each under the name of the operation. */
  Map<String, String> tokens() {
    return tokens;
  }

  void run() throws Exception {
    verdicts.title("Requests, judged by WSS4J", "Dialect", "Request", "Tree engine", "Stream engine",
      "Changed copies refused");
    try (Relay relay = new Relay(tls, URI.create(service.url()))) {
      judgeDialect(relay, "default", List.of(), false);
      judgeDialect(relay, "default, addressing", List.of("--addressing"), false);
      judgeDialect(relay, "default, use-key=certificate", List.of("--dialect-switch", "use-key=certificate"),
        false);
      judgeDialect(relay, "default, applies-to", List.of("--applies-to", "https://app.example/orders"), false);
      judgeDialect(relay, "cxf", List.of("--dialect", "cxf"), true);
      judgeDialect(relay, "cxf, addressing", List.of("--dialect", "cxf", "--addressing"), true);
    }
  }

  /** One signed request, exactly as the tool sent it. */
  String anySignedRequest() throws Exception {
    try (Relay relay = new Relay(tls, URI.create(service.url()))) {
      send(relay, operations().get(2), List.of());
      return text(relay.take());
    }
  }

  private static List<String> join(List<String> first, String... more) {
    List<String> all = new ArrayList<>(first);
    all.addAll(List.of(more));
    return all;
  }

  private static List<Operation> operations() {
    List<String> password = List.of("acquire", "--user", "alice@corp.example", "--password-file", "${password}");
    List<String> certificate = join(List.of("acquire"), IDENTITY.toArray(String[]::new));
    List<String> renewable = join(certificate, "--renewable", DELEGABLE);
    return List.of(new Operation("issue by password", false, true, password),
      new Operation("issue by password, key, audiences, advice beyond ASCII", true, true,
        join(join(password, IDENTITY.toArray(String[]::new)), "--audience", "urn:a", "--audience", "urn:ö",
          "--advice", "urn:mapper:colour=grün & \"gelb\" €")),
      new Operation("issue by certificate", true, false, renewable),
      new Operation("issue by certificate, delegated", true, false,
        join(renewable, "--delegate-to", "bob@corp.example")),
      new Operation("issue by holder-of-key token", true, false,
        join(certificate, "--token", "${holder-of-key}")),
      new Operation("issue by holder-of-key token, delegated", true, false,
        join(certificate, "--token", "${holder-of-key}", "--delegate-to", "bob@corp.example")),
      new Operation("renew", true, false, join(join(List.of("renew"), IDENTITY.toArray(String[]::new)),
        "${holder-of-key}")),
      new Operation("validate", false, false, List.of("validate", "${holder-of-key}")));
  }

  private void judgeDialect(Relay relay, String dialect, List<String> options, boolean followsBasicSecurityProfile)
    throws Exception {
    String other = Base64.getEncoder().encodeToString(service.otherClient().certificate().getEncoded());
    for (Operation operation : operations()) {
      String subject = dialect + ": " + operation.name();
      Command.Outcome outcome = send(relay, operation, options);
      Relay.Request request = relay.take();
      if (request == null) {
        verdicts.check(subject, "one request", outcome.summary());
        continue;
      }
      String envelope = text(request);
      EnvelopeJudge.Expected expected = new EnvelopeJudge.Expected(operation.isSigned(), operation.hasUsername(),
        followsBasicSecurityProfile);
      String asTree = verdicts.check(subject + ", tree engine", EnvelopeJudge.VERIFIES,
        judge.judgeAsTree(envelope, expected));
      String asStream = verdicts.check(subject + ", stream engine", EnvelopeJudge.VERIFIES,
        judge.judgeAsStream(envelope, expected));
      verdicts.row(dialect, operation.name(), asTree, asStream,
        operation.isSigned() ? judgeChanged(subject, envelope, other, expected) : "not signed");
    }
  }

  private String judgeChanged(String subject, String envelope, String otherCertificate,
    EnvelopeJudge.Expected expected) throws Exception {
    int refused = 0;
    Map<String, String> copies = EnvelopeChanges.of(envelope, otherCertificate);
    for (Map.Entry<String, String> copy : copies.entrySet()) {
      String answer = judge.judgeAsTree(copy.getValue(), expected);
      boolean isRefused = !answer.equals(EnvelopeJudge.VERIFIES);
      verdicts.check(subject + ", changed: " + copy.getKey(), TokenJudge.REFUSED,
        isRefused ? TokenJudge.REFUSED : answer);
      refused += isRefused ? 1 : 0;
    }
    return refused + " of " + copies.size();
  }

  private static String text(Relay.Request request) {
    return new String(request.body(), StandardCharsets.UTF_8);
  }

  /** Runs the tool, and keeps the token. In other dialects, the service may refuse: here only the request counts. */
  private Command.Outcome send(Relay relay, Operation operation, List<String> options) throws Exception {
    List<String> command = new ArrayList<>(List.of(tool.toString()));
    // The dialect of CXF has no such element, so the tool refuses the option.
    boolean saysDelegatable = !options.contains("cxf");
    for (String argument : operation.arguments()) {
      if (saysDelegatable || !argument.equals(DELEGABLE)) {
        command.add(replace(argument));
      }
    }
    command.addAll(options);
    command.addAll(List.of("--sts", relay.url(), "--ca", service.authorityFile().toString(), "--trust",
      service.signingFile().toString()));
    boolean isValidate = operation.arguments().get(0).equals("validate");
    Path out = folder.resolve("issued.xml");
    if (!isValidate) {
      command.addAll(List.of("--out", out.toString()));
    }
    Command.Outcome outcome = Command.run(folder, command);
    if (Files.exists(out)) {
      keep(operation, options, Files.readString(out));
      Files.delete(out);
    } else if (options.isEmpty() && !outcome.succeeded()) {
      verdicts.check(operation.name(), "exit status 0", outcome.summary());
    }
    return outcome;
  }

  private void keep(Operation operation, List<String> options, String token) throws Exception {
    if (options.isEmpty()) {
      tokens.put(operation.name(), token);
    }
    Path kept = folder.resolve("holder-of-key.xml");
    if (operation.name().equals("issue by certificate") && !Files.exists(kept)) {
      Files.writeString(kept, token);
    }
  }

  private String replace(String argument) {
    return switch (argument) {
      case "${cert}" -> service.client().certificateFile().toString();
      case "${key}" -> service.clientKeyFile().toString();
      case "${password}" -> service.passwordFile().toString();
      case "${holder-of-key}" -> folder.resolve("holder-of-key.xml").toString();
      default -> argument;
    };
  }
}
