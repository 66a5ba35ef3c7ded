#pragma once

#include "ssoClient/SamlToken.h"
#include "ssoClient/TokenSpec.h"
#include "ssoClient/message/xmlCommonBuilders.h"

#include <set>
#include <string>
#include <vector>

/**
 * The bodies of WS-Trust 1.3 requests and their parts. Values are written as they are given;
 * nothing is checked here but what would be a mistake of the library itself.
 */
namespace SsoClient {

/** `wst:Lifetime` from the moment of this call [WST13 4.1]. */
XMLBuilderPtr WssuLifetimeBuilder(long long lifetimeSec);

/** `wst:Renewing`. Renewal after expiry is never asked for [WST13 5]. */
XMLBuilderPtr WstRenewingBuilder(bool allow);

/** `wst:DelegateTo` with a user name. */
XMLBuilderPtr WstDelegateToBuilder(const std::string& userName);

/** `wst:Participants`, one for each name, none of them primary [WST13 9.5]. */
XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string>& participants);
XMLBuilderPtr WstParticipantBuilder(const std::string& participant);

/** `wsa:EndpointReference`. It does not declare `wsa`: `wst:Participants` does. */
XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string& address);

/** `rsa-advice:AdviceSet`; it declares the namespaces for the two below, which do not. */
XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice>& advice);
XMLBuilderPtr RsaAdviceBuilder(const Advice& advice);
XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute& attribute);

/** What all issue requests have in common, open for further children. */
boost::shared_ptr<XMLCompositeBuilder> CommonAcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec);

/**
 * An issue request for credentials in the security header. A holder-of-key token that is not
 * delegated is bound to the key that signs the request.
 */
XMLBuilderPtr AcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec);

/** An issue request for a token in the security header, which itself proves who asks. */
XMLBuilderPtr ExchangeSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation, const TokenSpec& spec);

/** A renew request for a holder-of-key token; another one stops the process. */
XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken& token, long long lifetimeSec);

/** A request for the status of a token [WST13 7]. */
XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken& token);

} // namespace SsoClient
