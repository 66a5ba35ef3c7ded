#pragma once

#include "ssoClient/HolderOfKeyConfig.h"
#include "ssoClient/message/xmlCommonBuilders.h"
#include "ssoClient/protocol/RequestBuilder.h"

#include <boost/optional.hpp>

namespace SsoClient {

class RequestBuilderImpl final : public RequestBuilder
{
public:
    /** @param holderOfKeyConfig  the caller's own identity. Without key or certificate it is none.
     */
    explicit RequestBuilderImpl(const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig);

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

    // Each gives the envelope as text.
    std::string BuildTokenRequest(
        TokenSpec::Confirmation confirmation,
        XMLBuilderPtr headerBuilder,
        XMLBuilderPtr bodyBuilder) const;
    std::string BuildCertRefSignedRequest(
        XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder) const;
    std::string BuildSamlRefSignedRequest(
        const std::string& tokenId, XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder) const;
    const HolderOfKeyConfig& GetHolderOfKeyConfig() const;

    boost::optional<HolderOfKeyConfig> _holderOfKeyConfig;
};

} // namespace SsoClient
