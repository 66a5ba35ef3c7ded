#pragma once

#include "ssoClient/HolderOfKeyConfig.h"
#include "ssoClient/RequestBuilder.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/xmlCommonBuilders.h"

#include <boost/optional.hpp>

namespace SsoClient {

class RequestBuilderImpl final : public RequestBuilder
{
public:
    /** @param holderOfKeyConfig  the caller's own identity, if there is one. */
    explicit RequestBuilderImpl(const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig);

    void BuildUserPassTokenRequest(
        const std::string& userName,
        const std::string& password,
        const TokenSpec& spec,
        Request& request) const override;

private:
    SamlToken::ConfirmationType GetEffectiveConfirmationType(
        TokenSpec::Confirmation confirmation) const;

    std::string BuildUnSignedRequest(XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder) const;
    std::string BuildTokenRequest(
        TokenSpec::Confirmation confirmation,
        XMLBuilderPtr headerBuilder,
        XMLBuilderPtr bodyBuilder) const;

    boost::optional<HolderOfKeyConfig> _holderOfKeyConfig;
};

} // namespace SsoClient
