#pragma once

#include "ssoClient/HolderOfKeyConfig.h"
#include "ssoClient/PasswordCredentials.h"
#include "ssoClient/ServiceDialect.h"
#include "ssoClient/message/xmlRequestBuilders.h"
#include "ssoClient/message/xmlSoapBuilders.h"
#include "ssoClient/protocol/RequestBuilder.h"

#include <boost/optional.hpp>

#include <string>

namespace SsoClient {

namespace Wire {
struct TrustNames;
}

/** How requests are written, and for whom. */
struct RequestForm
{
    ServiceDialect dialect;
    std::string url; ///< of the service; only for a dialect with addressing
    /** Who asks, in requests that present a token in their body. */
    boost::optional<PasswordCredentials> credentials;
};

class RequestBuilderImpl final : public RequestBuilder
{
public:
    /** @param holderOfKeyConfig  the caller's own identity. Without key or certificate it is none.
     */
    explicit RequestBuilderImpl(
        const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig,
        RequestForm form = RequestForm());

    void BuildUserPassTokenRequest(
        const std::string& userName,
        const std::string& password,
        const TokenSpec& spec,
        Request& request) const override;
    void BuildInitialSPNegoRequest(
        const TokenSpec& spec, const Leg& leg, Request& request) const override;
    void BuildContinuedSPNegoRequest(
        const std::string& contextId, const Leg& leg, Request& request) const override;
    void BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const override;
    void BuildExchangeTokenRequest(
        const SamlToken& token, const TokenSpec& spec, Request& request) const override;
    void BuildValidateSubjectRequest(const SamlToken& token, Request& request) const override;
    void BuildRenewRequest(
        const SamlToken& token, long long lifetimeSec, Request& request) const override;

private:
    void ValidateHokIsConfigured(const std::string& operationName) const;
    SamlToken::ConfirmationType GetEffectiveConfirmationType(
        TokenSpec::Confirmation confirmation) const;

    void BuildRequestWithTokenInHeader(
        const SamlToken& token, const TokenSpec& spec, Request& request) const;
    void BuildRequestWithTokenInBody(
        const SamlToken& token, const TokenSpec& spec, Request& request) const;

    /** A header with the configured user name and password, if there are any. */
    XMLBuilderPtr CreateHeaderWithCredentials() const;
    IssueForm GetIssueForm(XMLBuilderPtr keyReference) const;
    EnvelopeForm GetEnvelopeForm(const Request& request) const;
    void SetAction(const char* action, Request& request) const;
    const char* GetSamlTokenType() const noexcept;
    const Wire::TrustNames& GetTrustNames() const noexcept;

    // Each makes the envelope of a request whose action is set.
    void BuildTokenRequest(
        TokenSpec::Confirmation confirmation,
        XMLBuilderPtr headerBuilder,
        XMLBuilderPtr bodyBuilder,
        Request& request) const;
    void BuildUnSignedRequest(
        XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder, Request& request) const;
    void BuildCertRefSignedRequest(
        XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder, Request& request) const;
    void BuildSamlRefSignedRequest(
        const std::string& tokenId,
        XMLBuilderPtr headerBuilder,
        XMLBuilderPtr bodyBuilder,
        Request& request) const;
    const HolderOfKeyConfig& GetHolderOfKeyConfig() const;

    boost::optional<HolderOfKeyConfig> _holderOfKeyConfig;
    RequestForm _form;
};

} // namespace SsoClient
