// SPDX-License-Identifier: Apache-2.0
package interop;

import javax.xml.bind.JAXBElement;
import org.apache.cxf.sts.request.ReceivedToken;
import org.apache.cxf.sts.token.validator.TokenValidator;
import org.apache.cxf.sts.token.validator.TokenValidatorParameters;
import org.apache.cxf.sts.token.validator.TokenValidatorResponse;
import org.apache.cxf.ws.security.sts.provider.model.secext.UsernameTokenType;
import org.apache.wss4j.common.principal.CustomTokenPrincipal;

/**
 * Decides which users `wst:OnBehalfOf` and `wst14:ActAs` may name without a password, for a deployer that permits delegation
 * by name. CXF's own validator of names requires the password of the represented user.
 */
final class NamedUserValidator implements TokenValidator {
  private final Users users;

  NamedUserValidator(Users users) {
    this.users = users;
  }

  @Override
  public boolean canHandleToken(ReceivedToken token) {
    return canHandleToken(token, null);
  }

  @Override
  public boolean canHandleToken(ReceivedToken token, String realm) {
    return token.getToken() instanceof UsernameTokenType;
  }

  @Override
  public TokenValidatorResponse validateToken(TokenValidatorParameters parameters) {
    final ReceivedToken token = parameters.getToken();
    final String name = ((UsernameTokenType) token.getToken()).getUsername().getValue();
    final TokenValidatorResponse response = new TokenValidatorResponse();
    token.setState(users.contains(name) ? ReceivedToken.STATE.VALID : ReceivedToken.STATE.INVALID);
    token.setPrincipal(new CustomTokenPrincipal(name));
    response.setToken(token);
    response.setPrincipal(token.getPrincipal());
    return response;
  }
}
