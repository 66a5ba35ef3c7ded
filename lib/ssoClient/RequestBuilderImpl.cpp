#include "ssoClient/RequestBuilderImpl.h"

#include "quillon/xml/Parser.h"
#include "ssoClient/wireNames.h"
#include "ssoClient/xmlRequestBuilders.h"
#include "ssoClient/xmlSecurityBuilders.h"
#include "ssoClient/xmlSoapBuilders.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

namespace SsoClient {

namespace {

constexpr int TimestampValidityMinutes = 10;

void ValidateLifetime(long long lifetime)
{
    if (lifetime <= 0) {
        throw Quillon::InvalidArgumentException("Token lifetime must be positive");
    }
}

// The service takes a request that delegates only unsigned, whatever its body asks for.
TokenSpec::Confirmation ConfOverrideWithDelegate(const TokenSpec& spec)
{
    return spec.delegateTo ? TokenSpec::CONFIRMATION_BEARER : spec.confirmation;
}

std::string SerializeToXML(const XMLBaseBuilder& builder)
{
    Quillon::Ref<Quillon::Xml::ElementNode> root;
    builder.build(root);
    const Quillon::Ref<Quillon::StringWriter> writer = Quillon::CreateStringWriter();
    Quillon::Xml::Serialize(root.get(), writer.get());
    return writer->TakeString();
}

} // namespace

RequestBuilderImpl::RequestBuilderImpl(const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig)
    : _holderOfKeyConfig(holderOfKeyConfig)
{}

void RequestBuilderImpl::BuildUserPassTokenRequest(
    const std::string& userName,
    const std::string& password,
    const TokenSpec& spec,
    Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    const auto header =
        boost::make_shared<XMLCompositeBuilder>(WsSecurityHeaderBuilder(TimestampValidityMinutes));
    header->Add(WsseUsernameTokenBuilder(userName, password));
    XMLBuilderPtr body =
        AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
    request.soapAction = Wire::IssueAction;
    request.body = BuildTokenRequest(ConfOverrideWithDelegate(spec), header, std::move(body));
}

SamlToken::ConfirmationType RequestBuilderImpl::GetEffectiveConfirmationType(
    TokenSpec::Confirmation confirmation) const
{
    return _holderOfKeyConfig && confirmation == TokenSpec::CONFIRMATION_DEFAULT
               ? SamlToken::CONFIRM_HOLDER_OF_KEY
               : SamlToken::CONFIRM_BEARER;
}

std::string RequestBuilderImpl::BuildUnSignedRequest(
    XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder) const
{
    return SerializeToXML(*SoapBuilder(std::move(headerBuilder), std::move(bodyBuilder)));
}

std::string RequestBuilderImpl::BuildTokenRequest(
    TokenSpec::Confirmation confirmation,
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder) const
{
    if (GetEffectiveConfirmationType(confirmation) == SamlToken::CONFIRM_HOLDER_OF_KEY) {
        throw Quillon::InvalidStateException(
            "Requests for holder-of-key tokens cannot be signed yet");
    }
    return BuildUnSignedRequest(std::move(headerBuilder), std::move(bodyBuilder));
}

} // namespace SsoClient
