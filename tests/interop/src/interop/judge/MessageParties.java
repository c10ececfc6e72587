// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.KeyStore;
import java.time.Instant;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;

/** Who sends messages: the holders of tokens of the development service, and of tokens that OpenSAML makes. */
final class MessageParties {
  private final Identity issuer;
  private final Identity other;
  private final Map<String, MessageMaker.Token> tokens;
  private final Map<String, Path> issuers = new LinkedHashMap<>();

  /** `strictToken` is a token of the development service for its client. */
  MessageParties(DevelopmentService service, String strictToken, Path tool, Path folder) throws Exception {
    issuer = Identity.make(folder, "message-issuer", "rsa:2048");
    Identity holder = Identity.make(folder, "message-holder", "rsa:2048");
    other = Identity.make(folder, "message-other", "rsa:2048");
    Map<String, Identity> curves = new LinkedHashMap<>();
    for (String size : List.of("256", "384", "521")) {
      curves.put(size, Identity.make(folder, "message-p" + size, "ec", "-pkeyopt", "ec_paramgen_curve:P-" + size));
    }
    tokens = MessageTokens.make(issuer, holder, curves);
    tokens.put("other", MessageTokens.make(issuer, other, Map.of()).get("rsa-certificate"));
    tokens.keySet().forEach(name -> issuers.put(name, issuer.certificateFile()));
    tokens.put("strict", new MessageMaker.Token(strictToken, service.client()));
    tokens.put("other-strict", new MessageMaker.Token(acquire(service, service.otherClient(), tool, folder),
      service.otherClient()));
    issuers.put("strict", service.signingFile());
    issuers.put("other-strict", service.signingFile());
  }

  MessageMaker maker() {
    return new MessageMaker(tokens, other, Instant.now());
  }

  /** The certificate of the service that issued each token, under the token's name. */
  Map<String, Path> issuers() {
    return issuers;
  }

  /** Adds whom a service must trust: who issues tokens, and the other party that signs. */
  void trust(KeyStore store) throws Exception {
    store.setCertificateEntry("message-issuer", issuer.certificate());
    store.setCertificateEntry("message-other", other.certificate());
  }

  private static String acquire(DevelopmentService service, Identity client, Path tool, Path folder) throws Exception {
    Path out = folder.resolve("other-strict.xml");
    Command.Outcome outcome = Command.run(folder, List.of(tool.toString(), "acquire", "--sts", service.url(), "--ca",
      service.authorityFile().toString(), "--trust", service.signingFile().toString(), "--cert",
      client.certificateFile().toString(), "--key", client.keyFile().toString(), "--out", out.toString()));
    if (!outcome.succeeded()) {
      throw new IOException("no token for another client: " + outcome.summary());
    }
    return Files.readString(out);
  }
}
