// SPDX-License-Identifier: Apache-2.0
package interop;

import java.security.Principal;
import java.util.ArrayList;
import java.util.List;
import org.apache.cxf.sts.request.ReceivedToken;
import org.apache.cxf.sts.token.provider.AttributeStatementProvider;
import org.apache.cxf.sts.token.provider.TokenProviderParameters;
import org.apache.wss4j.common.saml.bean.AttributeBean;
import org.apache.wss4j.common.saml.bean.AttributeStatementBean;

/** The groups of a token's subject. CXF's handlers of claims write only what a request asks for with `wst:Claims`. */
final class GroupStatement implements AttributeStatementProvider {
  private static final String GROUP_IDENTITY = "http://www.rsa.com/schemas/attr-names/2009/01/GroupIdentity";
  private static final String URI_NAMES = "urn:oasis:names:tc:SAML:2.0:attrname-format:uri";

  private final Users users;

  GroupStatement(Users users) {
    this.users = users;
  }

  @Override
  public AttributeStatementBean getStatement(TokenProviderParameters parameters) {
    final List<Object> groups = new ArrayList<>(users.groupsOf(subjectOf(parameters).getName()));
    if (groups.isEmpty()) {
      return null;
    }
    final AttributeStatementBean statement = new AttributeStatementBean();
    statement.setSamlAttributes(List.of(new AttributeBean("groups", GROUP_IDENTITY, groups)));
    statement.getSamlAttributes().get(0).setNameFormat(URI_NAMES);
    return statement;
  }

  private static Principal subjectOf(TokenProviderParameters parameters) {
    final ReceivedToken represented = parameters.getTokenRequirements().getOnBehalfOf();
    return represented != null ? represented.getPrincipal() : parameters.getPrincipal();
  }
}
