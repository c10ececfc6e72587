// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.cert.CertificateEncodingException;
import java.security.cert.X509Certificate;
import java.util.ArrayList;
import java.util.Base64;
import java.util.List;

/** Judges the signature of a message with xmlsec1, which is of another origin than WSS4J and Santuario. */
final class XmlsecJudge {
  static final String VERIFIES = "verifies";
  static final String REFUSED = "refused";

  private static final String SECURITY = "/*/*[local-name()='Header']/*[local-name()='Security']";

  private final Path folder;

  XmlsecJudge(Path folder) {
    this.folder = folder;
  }

  /** Judges the first signature of the security header by the certificate; the signature's KeyInfo is not read. */
  String judge(String message, X509Certificate certificate) throws IOException, InterruptedException {
    Path file = Files.createTempFile(folder, "message", ".xml");
    Path key = Files.createTempFile(folder, "certificate", ".pem");
    try {
      Files.writeString(file, message);
      Files.writeString(key, pem(certificate));
      List<String> command = new ArrayList<>(List.of("xmlsec1", "--verify", "--pubkey-cert-pem", key.toString(),
        "--enabled-key-data", "key-name", "--node-xpath", SECURITY + "/*[local-name()='Signature'][1]", "--id-attr:ID",
        Xml.SAML + ":Assertion"));
      for (String element : List.of(Xml.SOAP + ":Body", Xml.SOAP12 + ":Body", Xml.WSU + ":Timestamp",
        MessageMaker.ORDERS + ":Priority", Xml.WSA + ":Action", Xml.WSA + ":MessageID", Xml.WSA + ":To",
        Xml.WSA + ":ReplyTo")) {
        command.addAll(List.of("--id-attr:Id", element));
      }
      command.add(file.toString());
      return Command.run(folder, command).succeeded() ? VERIFIES : REFUSED;
    } catch (CertificateEncodingException failure) {
      throw new IllegalArgumentException(failure);
    } finally {
      Files.delete(file);
      Files.deleteIfExists(key);
    }
  }

  private static String pem(X509Certificate certificate) throws CertificateEncodingException {
    return "-----BEGIN CERTIFICATE-----\n" + Base64.getMimeEncoder().encodeToString(certificate.getEncoded())
      + "\n-----END CERTIFICATE-----\n";
  }
}
