// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.nio.file.Files;
import java.nio.file.Path;
import java.security.KeyStore;
import java.security.cert.X509Certificate;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import javax.net.ssl.KeyManagerFactory;
import javax.net.ssl.SSLContext;
import javax.net.ssl.TrustManagerFactory;
import org.apache.wss4j.common.saml.OpenSAMLUtil;
import org.apache.wss4j.dom.engine.WSSConfig;

/**
 * Compares what this project's tool writes and reads with WSS4J, Santuario and OpenSAML.
 *
 * usage: Judge TOOL SERVICE FOLDER TABLE [TOKEN CERTIFICATE]...
 * TOOL and SERVICE are the programs; FOLDER is empty and for files of the run; TABLE is the Markdown file to write.
 * Each TOKEN is a file with a token of another service, and CERTIFICATE that service's. The exit status is 1 when
 * the judges disagree with each other.
 */
public final class Judge {
  private static final int FIXED_ARGUMENTS = 4;

  private Judge() {
  }

  /** Runs all judges. */
  public static void main(String[] arguments) throws Exception {
    if (arguments.length < FIXED_ARGUMENTS || arguments.length % 2 != 0) {
      System.err.println("usage: Judge TOOL SERVICE FOLDER TABLE [TOKEN CERTIFICATE]...");
      System.exit(2);
    }
    Path tool = Path.of(arguments[0]).toAbsolutePath();
    Path folder = Path.of(arguments[2]).toAbsolutePath();
    initialise();
    Verdicts verdicts = new Verdicts();
    int selfChecks;
    try (DevelopmentService service = new DevelopmentService(Path.of(arguments[1]).toAbsolutePath(), folder)) {
      X509Certificate signing = Identity.certificate(service.signingFile());
      KeyStore trusted = trustStore(signing, service.client().certificate(), service.otherClient().certificate());
      EnvelopeJudge judge = new EnvelopeJudge(trusted, DevelopmentService.PASSWORDS);
      RequestJudgement requests = new RequestJudgement(verdicts, judge, service, tlsContext(service), tool, folder);
      requests.run();
      TokenJudgement tokens = new TokenJudgement(verdicts, tool, folder);
      tokens.judgeIssued(requests.tokens(), signing);
      Map<Path, Path> foreign = new LinkedHashMap<>();
      for (int index = FIXED_ARGUMENTS; index < arguments.length; index += 2) {
        foreign.put(Path.of(arguments[index]), Path.of(arguments[index + 1]));
      }
      tokens.judgeForeign(foreign);
      tokens.judgeMade();
      MessageParties parties = new MessageParties(service, requests.tokens().get("issue by certificate"), tool, folder);
      // The certificates of those that hold tokens are not trusted: only the tokens prove whose keys they are.
      KeyStore trustedByServices = trustStore(signing);
      parties.trust(trustedByServices);
      MessageJudge messageJudge = new MessageJudge(trustedByServices);
      MessageJudgement messages = new MessageJudgement(verdicts, messageJudge, parties.maker(), parties.issuers(), tool,
        folder);
      messages.run();
      verdicts.disagreements().forEach(line -> System.err.println("judge: " + line));
      selfChecks = SelfCheck.run(judge, requests.anySignedRequest(), requests.tokens(), signing)
        + SelfCheck.runMessages(messageJudge, messages, new XmlsecJudge(folder), signing);
    }
    Files.writeString(Path.of(arguments[3]), verdicts.markdown());
    System.out.println("judge: " + verdicts.size() + " answers, " + verdicts.disagreements().size()
      + " disagreements; " + selfChecks + " wrong expectations noticed");
    System.exit(verdicts.disagreements().isEmpty() ? 0 : 1);
  }

  private static void initialise() throws Exception {
    OpenSAMLUtil.initSamlEngine();
    WSSConfig.init();
  }

  private static KeyStore trustStore(X509Certificate... certificates) throws Exception {
    KeyStore store = KeyStore.getInstance("PKCS12");
    store.load(null, null);
    for (X509Certificate certificate : List.of(certificates)) {
      store.setCertificateEntry(certificate.getSubjectX500Principal().getName(), certificate);
    }
    return store;
  }

  /** The relay has the service's own certificate, and trusts the service's authority. */
  private static SSLContext tlsContext(DevelopmentService service) throws Exception {
    char[] password = "judge".toCharArray();
    KeyStore keys = trustStore(Identity.certificate(service.authorityFile()));
    keys.setKeyEntry("tls", service.tls().key(), password, new X509Certificate[] {service.tls().certificate()});
    KeyManagerFactory keyManagers = KeyManagerFactory.getInstance(KeyManagerFactory.getDefaultAlgorithm());
    keyManagers.init(keys, password);
    TrustManagerFactory trustManagers = TrustManagerFactory.getInstance(TrustManagerFactory.getDefaultAlgorithm());
    trustManagers.init(keys);
    SSLContext context = SSLContext.getInstance("TLS");
    context.init(keyManagers.getKeyManagers(), trustManagers.getTrustManagers(), null);
    return context;
  }
}
