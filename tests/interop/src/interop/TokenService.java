// SPDX-License-Identifier: Apache-2.0
package interop;

import java.io.IOException;
import java.io.OutputStream;
import java.net.BindException;
import java.net.ServerSocket;
import java.nio.file.Path;
import java.util.HashMap;
import java.util.List;
import java.util.Map;
import java.util.stream.Stream;
import javax.xml.namespace.QName;
import org.apache.cxf.Bus;
import org.apache.cxf.BusFactory;
import org.apache.cxf.configuration.jsse.TLSServerParameters;
import org.apache.cxf.jaxws.EndpointImpl;
import org.apache.cxf.sts.StaticSTSProperties;
import org.apache.cxf.sts.cache.DefaultInMemoryTokenStore;
import org.apache.cxf.sts.operation.AbstractOperation;
import org.apache.cxf.sts.operation.TokenIssueOperation;
import org.apache.cxf.sts.operation.TokenRenewOperation;
import org.apache.cxf.sts.operation.TokenValidateOperation;
import org.apache.cxf.sts.service.StaticService;
import org.apache.cxf.sts.token.delegation.UsernameTokenDelegationHandler;
import org.apache.cxf.sts.token.provider.ActAsAttributeStatementProvider;
import org.apache.cxf.sts.token.provider.SAMLTokenProvider;
import org.apache.cxf.sts.token.renewer.SAMLTokenRenewer;
import org.apache.cxf.sts.token.validator.SAMLTokenValidator;
import org.apache.cxf.sts.token.validator.TokenValidator;
import org.apache.cxf.sts.token.validator.X509TokenValidator;
import org.apache.cxf.transport.http_jetty.JettyHTTPServerEngineFactory;
import org.apache.cxf.ws.security.SecurityConstants;
import org.apache.cxf.ws.security.sts.provider.SecurityTokenServiceProvider;
import org.apache.cxf.ws.security.tokenstore.TokenStore;
import org.apache.cxf.ws.security.wss4j.WSS4JInInterceptor;
import org.apache.wss4j.common.ConfigurationConstants;
import org.apache.wss4j.common.crypto.Crypto;

/**
 * A CXF token service with what a deployer sets in its configuration, and nothing else: each class is CXF's own or implements an
 * interface that CXF has for deployers. It prints its address when it is ready, and ends when its standard input does.
 */
public final class TokenService {
  static final String KEY_ALIAS = "sts";
  private static final String ISSUER = "https://sts.example/";
  private static final String WS_TRUST = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/";
  private static final String RSA_SHA256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
  private static final int ATTEMPTS = 5;

  private final Bus bus = BusFactory.getDefaultBus();
  private final DeployedKeys keys;
  private final Users users;
  private final Crypto crypto;
  private final TokenStore issuedTokens;
  private final String address;

  private TokenService(Path folder) throws Exception {
    keys = new DeployedKeys(folder);
    users = new Users(folder.resolve("users"));
    crypto = keys.crypto();
    issuedTokens = new DefaultInMemoryTokenStore(bus);
    final int port = freePort();
    address = "https://127.0.0.1:" + port;
    final TLSServerParameters tls = new TLSServerParameters();
    tls.setKeyManagers(keys.serverKeys());
    bus.getExtension(JettyHTTPServerEngineFactory.class).setTLSServerParametersForPort(port, tls);
  }

  public static void main(String[] arguments) throws Exception {
    final TokenService service = start(Path.of(arguments[0]));
    System.out.println(service.address);
    System.in.transferTo(OutputStream.nullOutputStream());
    System.exit(0);
  }

  /** Another process may take the free port before this one does, so there are several attempts. */
  private static TokenService start(Path folder) throws Exception {
    for (int attempt = 1;; ++attempt) {
      try {
        final TokenService service = new TokenService(folder);
        service.publishAll();
        return service;
      } catch (Exception failure) {
        final boolean taken =
            Stream.iterate((Throwable) failure, e -> e != null, Throwable::getCause).anyMatch(e -> e instanceof BindException);
        if (!taken || attempt == ATTEMPTS) {
          throw failure;
        }
      }
    }
  }

  private static int freePort() throws IOException {
    try (ServerSocket socket = new ServerSocket(0)) {
      return socket.getLocalPort();
    }
  }

  private void publishAll() {
    // Without a policy, an interceptor lists what a header must have.
    publishPlain("/plain/ut", "Timestamp UsernameToken");
    publishPlain("/plain/x509", "Timestamp Signature");
    publishPlain("/plain/ut-x509", "Timestamp UsernameToken Signature");
    publishPlain("/plain/saml", "Timestamp Signature SAMLTokenSigned");
    publishPlain("/plain/timestamp", "Timestamp");

    // With a policy, the WSDL states it. Only what WS-SecurityPolicy cannot express is written here.
    publishPolicy("/sts", "sts", Map.of());
    publishPolicy("/ut", "ut", Map.of());
    publishPolicy("/x509", "x509", Map.of());
    publishPolicy("/ut-x509", "ut-x509", Map.of());
    publishPolicy("/saml", "saml", Map.of());
    publishPolicy("/addressing", "addressing", Map.of());
    publishPolicy("/addressing-x509", "addressing-x509", Map.of());
    publishPolicy("/fault-names", "ut", Map.of("ws-security.return.security.error", true));
  }

  private void publishPlain(String path, String actions) {
    final Map<String, Object> settings = new HashMap<>();
    settings.put(ConfigurationConstants.ACTION, actions);
    settings.put(ConfigurationConstants.PW_CALLBACK_REF, users);
    settings.put(ConfigurationConstants.SIG_VER_PROP_REF_ID, "trusted");
    settings.put("trusted", crypto);
    final EndpointImpl endpoint = new EndpointImpl(bus, provider());
    endpoint.getInInterceptors().add(new WSS4JInInterceptor(settings));
    endpoint.publish(address + path);
  }

  private void publishPolicy(String path, String port, Map<String, Object> further) {
    final Map<String, Object> settings = new HashMap<>(further);
    settings.put(SecurityConstants.CALLBACK_HANDLER, users);
    settings.put(SecurityConstants.SIGNATURE_CRYPTO, crypto);
    // The suites of WS-SecurityPolicy name no signature method, and CXF's default is RSA-SHA1.
    settings.put(SecurityConstants.ASYMMETRIC_SIGNATURE_ALGORITHM, RSA_SHA256);
    final EndpointImpl endpoint = new EndpointImpl(bus, provider());
    endpoint.setWsdlLocation(TokenService.class.getResource("/sts.wsdl").toString());
    endpoint.setServiceName(new QName(WS_TRUST, "SecurityTokenService"));
    endpoint.setEndpointName(new QName(WS_TRUST, port));
    endpoint.setProperties(settings);
    endpoint.publish(address + path);
  }

  private SecurityTokenServiceProvider provider() {
    final SecurityTokenServiceProvider provider;
    try {
      provider = new SecurityTokenServiceProvider();
    } catch (Exception failure) {
      throw new IllegalStateException(failure);
    }
    final TokenIssueOperation issue = configured(new TokenIssueOperation());
    issue.setTokenValidators(List.of(new NamedUserValidator(users), new X509TokenValidator(), samlValidator()));
    issue.setDelegationHandlers(List.of(new UsernameTokenDelegationHandler()));
    issue.setServices(List.of(knownService()));
    final TokenRenewOperation renew = configured(new TokenRenewOperation());
    renew.setTokenValidators(List.of(samlValidator()));
    renew.setTokenRenewers(List.of(new SAMLTokenRenewer()));
    final TokenValidateOperation validate = configured(new TokenValidateOperation());
    validate.setTokenValidators(List.of(samlValidator()));
    provider.setIssueOperation(issue);
    provider.setRenewOperation(renew);
    provider.setValidateOperation(validate);
    return provider;
  }

  private <Operation extends AbstractOperation> Operation configured(Operation operation) {
    final StaticSTSProperties properties = new StaticSTSProperties();
    properties.setIssuer(ISSUER);
    properties.setSignatureCrypto(crypto);
    properties.setSignatureUsername(KEY_ALIAS);
    properties.setCallbackHandler(users);
    final SAMLTokenProvider tokens = new SAMLTokenProvider();
    tokens.setAttributeStatementProviders(List.of(new GroupStatement(users), new ActAsAttributeStatementProvider()));
    operation.setStsProperties(properties);
    operation.setTokenProviders(List.of(tokens));
    operation.setTokenStore(issuedTokens);
    return operation;
  }

  private static TokenValidator samlValidator() {
    return new SAMLTokenValidator();
  }

  /** The services to which `wsp:AppliesTo` may refer. */
  private static StaticService knownService() {
    final StaticService service = new StaticService();
    service.setEndpoints(List.of("https://app\\.example/.*"));
    return service;
  }
}
