// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.BufferedReader;
import java.io.InputStreamReader;
import java.lang.management.ManagementFactory;
import java.lang.management.ThreadMXBean;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.KeyStore;
import java.security.cert.X509Certificate;
import java.util.ArrayList;
import java.util.Collections;
import java.util.List;
import java.util.concurrent.Callable;
import org.apache.wss4j.common.WSEncryptionPart;
import org.apache.wss4j.common.crypto.Merlin;
import org.apache.wss4j.common.saml.OpenSAMLUtil;
import org.apache.wss4j.common.saml.SamlAssertionWrapper;
import org.apache.wss4j.dom.engine.WSSConfig;
import org.apache.wss4j.dom.message.WSSecHeader;
import org.apache.wss4j.dom.message.WSSecTimestamp;
import org.apache.wss4j.dom.saml.WSSecSignatureSAML;
import org.w3c.dom.Document;

/**
 * Measures how long WSS4J takes to sign a message with the key of a token, and to verify it, each from text to text.
 * The body, the timestamp and the token are signed.
 *
 * usage: MessageSpeed TOKEN KEY CERTIFICATE ISSUER-CERTIFICATE ENVELOPE
 * For each line of standard input, it measures, and writes a line: the medians for signing and verifying, in
 * microseconds of processor time of the thread, without the garbage collector's.
 * What can be reused is prepared before: the token, the key, and the trust store.
 */
public final class MessageSpeed {
  private static final int ARGUMENTS = 5;
  private static final int WARM_UP = 3000;
  private static final int REPETITIONS = 1000;
  private static final int LIFETIME_SECONDS = 300;
  private static final char[] PASSWORD = "speed".toCharArray();

  private final SamlAssertionWrapper token;
  private final String envelope;
  private final Merlin key = new Merlin();
  private final MessageJudge judge;
  private final MessageJudge.Expected expected =
    new MessageJudge.Expected("", List.of("Assertion", "Timestamp", "Body"), 0, true);

  private MessageSpeed(String token, Identity holder, X509Certificate issuer, String envelope) throws Exception {
    this.token = new SamlAssertionWrapper(Xml.parse(token).getDocumentElement());
    this.envelope = envelope;
    KeyStore keys = KeyStore.getInstance("PKCS12");
    keys.load(null, null);
    keys.setKeyEntry("key", holder.key(), PASSWORD, new X509Certificate[] {holder.certificate()});
    key.setKeyStore(keys);
    key.setEnablePrivateKeyCaching(true);
    KeyStore trusted = KeyStore.getInstance("PKCS12");
    trusted.load(null, null);
    trusted.setCertificateEntry("issuer", issuer);
    judge = new MessageJudge(trusted);
  }

  /** Measures once for each line of standard input. */
  public static void main(String[] arguments) throws Exception {
    if (arguments.length != ARGUMENTS) {
      System.err.println("usage: MessageSpeed TOKEN KEY CERTIFICATE ISSUER-CERTIFICATE ENVELOPE");
      System.exit(2);
    }
    OpenSAMLUtil.initSamlEngine();
    WSSConfig.init();
    MessageSpeed speed = new MessageSpeed(Files.readString(Path.of(arguments[0])),
      Identity.load(Path.of(arguments[1]), Path.of(arguments[2])), Identity.certificate(Path.of(arguments[3])),
      Files.readString(Path.of(arguments[4])));
    String message = speed.sign();
    median(WARM_UP, speed::sign);
    median(WARM_UP, () -> speed.verify(message));
    BufferedReader input = new BufferedReader(new InputStreamReader(System.in, StandardCharsets.UTF_8));
    while (input.readLine() != null) {
      String fresh = speed.sign();
      System.out.printf("%.1f %.1f%n", median(REPETITIONS, speed::sign),
        median(REPETITIONS, () -> speed.verify(fresh)));
      System.out.flush();
    }
  }

  private String sign() throws Exception {
    Document document = Xml.parse(envelope);
    WSSecHeader header = new WSSecHeader(document);
    header.insertSecurityHeader();
    WSSecTimestamp timestamp = new WSSecTimestamp(header);
    timestamp.setTimeToLive(LIFETIME_SECONDS);
    timestamp.build();
    WSSecSignatureSAML signature = new WSSecSignatureSAML(header);
    signature.setUserInfo("key", new String(PASSWORD));
    signature.setSignatureAlgorithm(MessageKinds.RSA_SHA256);
    signature.setDigestAlgo("http://www.w3.org/2001/04/xmlenc#sha256");
    signature.getParts().add(
      new WSEncryptionPart("Body", document.getDocumentElement().getNamespaceURI(), "Element"));
    signature.getParts().add(new WSEncryptionPart("Timestamp", Xml.WSU, "Element"));
    signature.getParts().add(new WSEncryptionPart(token.getId()));
    signature.build(key, token, null, null, null);
    return Xml.write(document);
  }

  private String verify(String message) {
    String answer = judge.judgeAsTree(message, expected);
    if (!answer.equals(EnvelopeJudge.VERIFIES)) {
      throw new IllegalStateException(answer);
    }
    return answer;
  }

  private static double median(int repetitions, Callable<String> operation) throws Exception {
    ThreadMXBean clock = ManagementFactory.getThreadMXBean();
    List<Long> times = new ArrayList<>();
    for (int index = 0; index < repetitions; ++index) {
      long start = clock.getCurrentThreadCpuTime();
      operation.call();
      times.add(clock.getCurrentThreadCpuTime() - start);
    }
    Collections.sort(times);
    final double nanosecondsPerMicrosecond = 1000;
    return times.get(repetitions / 2) / nanosecondsPerMicrosecond;
  }
}
