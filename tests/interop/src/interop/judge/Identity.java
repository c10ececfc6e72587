// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.io.IOException;
import java.io.InputStream;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.GeneralSecurityException;
import java.security.KeyFactory;
import java.security.PrivateKey;
import java.security.cert.CertificateFactory;
import java.security.cert.X509Certificate;
import java.security.spec.PKCS8EncodedKeySpec;
import java.util.ArrayList;
import java.util.Base64;
import java.util.List;

/** A private key and its certificate, and their files. */
record Identity(PrivateKey key, X509Certificate certificate, Path keyFile, Path certificateFile) {
  /** Makes an identity with openssl. `newKey` is the key, as arguments of "openssl req -newkey". */
  static Identity make(Path folder, String name, String... newKey) throws Exception {
    Path keyFile = folder.resolve(name + ".key");
    Path certificateFile = folder.resolve(name + ".crt");
    List<String> command = new ArrayList<>(List.of("openssl", "req", "-x509", "-nodes", "-days", "2", "-subj",
      "/O=judge/CN=" + name, "-keyout", keyFile.toString(), "-out", certificateFile.toString(), "-newkey"));
    command.addAll(List.of(newKey));
    Command.Outcome outcome = Command.run(folder, command);
    if (outcome.status() != 0) {
      throw new IOException("openssl: " + outcome.errors());
    }
    return load(keyFile, certificateFile);
  }

  static Identity load(Path keyFile, Path certificateFile) throws IOException, GeneralSecurityException {
    String pem = Files.readString(keyFile).replaceAll("-----[A-Z ]+-----", "");
    PKCS8EncodedKeySpec encoded = new PKCS8EncodedKeySpec(Base64.getMimeDecoder().decode(pem));
    X509Certificate certificate = certificate(certificateFile);
    String algorithm = certificate.getPublicKey().getAlgorithm();
    return new Identity(KeyFactory.getInstance(algorithm).generatePrivate(encoded), certificate, keyFile,
      certificateFile);
  }

  static X509Certificate certificate(Path file) throws IOException, GeneralSecurityException {
    try (InputStream stream = Files.newInputStream(file)) {
      return (X509Certificate) CertificateFactory.getInstance("X.509").generateCertificate(stream);
    }
  }
}
