// SPDX-License-Identifier: Apache-2.0
package interop;

import java.io.InputStream;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.KeyStore;
import java.security.cert.Certificate;
import java.security.cert.CertificateFactory;
import javax.net.ssl.KeyManager;
import javax.net.ssl.KeyManagerFactory;
import org.apache.wss4j.common.crypto.Crypto;
import org.apache.wss4j.common.crypto.Merlin;

/** The keys and certificates that a run makes with openssl: `server.p12`, `sts.p12` and `trusted.pem`. */
final class DeployedKeys {
  static final char[] PASSWORD = "interop".toCharArray();

  private final Path folder;

  DeployedKeys(Path folder) {
    this.folder = folder;
  }

  KeyManager[] serverKeys() throws Exception {
    final KeyManagerFactory factory = KeyManagerFactory.getInstance(KeyManagerFactory.getDefaultAlgorithm());
    factory.init(load("server.p12"), PASSWORD);
    return factory.getKeyManagers();
  }

  /** The service's key, and the certificates whose signatures it accepts. */
  Crypto crypto() throws Exception {
    final Merlin crypto = new Merlin();
    crypto.setKeyStore(load("sts.p12"));
    crypto.setTrustStore(trusted());
    return crypto;
  }

  private KeyStore trusted() throws Exception {
    final KeyStore store = KeyStore.getInstance("PKCS12");
    store.load(null, PASSWORD);
    try (InputStream file = Files.newInputStream(folder.resolve("trusted.pem"))) {
      for (Certificate certificate : CertificateFactory.getInstance("X.509").generateCertificates(file)) {
        store.setCertificateEntry("trusted" + store.size(), certificate);
      }
    }
    return store;
  }

  private KeyStore load(String name) throws Exception {
    final KeyStore store = KeyStore.getInstance("PKCS12");
    try (InputStream file = Files.newInputStream(folder.resolve(name))) {
      store.load(file, PASSWORD);
    }
    return store;
  }
}
