#pragma once

#include "ssoClient/SamlToken.h"
#include "ssoClient/ServiceDialect.h"
#include "ssoClient/TokenSpec.h"
#include "ssoClient/message/xmlCommonBuilders.h"

#include <set>
#include <string>
#include <vector>

/**
 * The bodies of WS-Trust requests and their parts. Values are written as they are given;
 * nothing is checked here but what would be a mistake of the library itself.
 */
namespace SsoClient {

/** `wst:Lifetime` from the moment of this call [WST13 4.1]. */
XMLBuilderPtr WssuLifetimeBuilder(long long lifetimeSec);

/** `wst:Renewing`. Renewal after expiry is never asked for [WST13 5]. */
XMLBuilderPtr WstRenewingBuilder(bool allow);

/** `wst:DelegateTo` with a user name. */
XMLBuilderPtr WstDelegateToBuilder(const std::string& userName);

/**
 * `wst:UseKey`, with the signature of the request as the proof [WST13 9.2]. A null content leaves
 * it empty.
 */
XMLBuilderPtr WstUseKeyBuilder(XMLBuilderPtr content);

/** `wst:Claims` in the dialect of identity claims [WST13 4.1]. */
XMLBuilderPtr WstClaimsBuilder(const std::vector<RequestedClaim>& claims);

/** `wst:OnBehalfOf` [WST13 9.1] or `wst14:ActAs` [WST14 9.1] with the token. */
XMLBuilderPtr WstDelegatingTokenBuilder(PresentedTokenForm form, const SamlToken& token);

/** `wsp:AppliesTo` with the relying party's address [WST13 4.1]. */
XMLBuilderPtr WspAppliesToBuilder(const std::string& address);

/** `wst:Participants`, one for each name, none of them primary [WST13 9.5]. */
XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string>& participants);
XMLBuilderPtr WstParticipantBuilder(const std::string& participant);

/** `wsa:EndpointReference`. It does not declare `wsa`: `wst:Participants` does. */
XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string& address);

/** `rsa-advice:AdviceSet`; it declares the namespaces for the two below, which do not. */
XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice>& advice);
XMLBuilderPtr RsaAdviceBuilder(const Advice& advice);
XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute& attribute);

/** How an issue request is written beside what its token is to be. */
struct IssueForm
{
    ServiceDialect dialect;
    XMLBuilderPtr useKeyContent; ///< null for an empty `wst:UseKey`
};

/**
 * What all issue requests have in common, open for further children.
 *
 * @throws Quillon::InvalidArgumentException  several audiences where the dialect has room for one.
 */
boost::shared_ptr<XMLCompositeBuilder> CommonAcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation,
    const TokenSpec& spec,
    const ServiceDialect& dialect = ServiceDialect());

/**
 * An issue request for credentials in the security header. A holder-of-key token that is not
 * delegated is bound to the key that signs the request.
 */
boost::shared_ptr<XMLCompositeBuilder> AcquireSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation,
    const TokenSpec& spec,
    const IssueForm& form = IssueForm());

/**
 * An issue request for a token in the security header, which itself proves who asks, so that it
 * says of no key that it is to be used unless the dialect wants it.
 */
XMLBuilderPtr ExchangeSecurityTokenBuilder(
    SamlToken::ConfirmationType confirmation,
    const TokenSpec& spec,
    const IssueForm& form = IssueForm());

/** A renew request for a holder-of-key token; another one stops the process. */
XMLBuilderPtr RenewSecurityTokenBuilder(
    const SamlToken& token, long long lifetimeSec, TrustVersion trust = TrustVersion::WS_TRUST_1_3);

/** A request for the status of a token [WST13 7]. */
XMLBuilderPtr ValidateSecurityTokenBuilder(
    const SamlToken& token, TrustVersion trust = TrustVersion::WS_TRUST_1_3);

} // namespace SsoClient
