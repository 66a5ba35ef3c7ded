#include "ssoClient/protocol/RequestBuilderImpl.h"

#include "quillon/Exceptions.h"
#include "quillon/PanicVerify.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/message/xmlRequestBuilders.h"
#include "ssoClient/message/xmlSecurityBuilders.h"
#include "ssoClient/message/xmlSoapBuilders.h"
#include "ssoClient/protocol/xmlSpnego.h"
#include "ssoClient/wire/assertionPlaces.h"
#include "ssoClient/wire/wireNames.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

namespace SsoClient {

namespace {

constexpr char AcquireByCertificate[] = "acquire token by certificate";
constexpr char AcquireByToken[] = "acquire token by token";
constexpr char Renew[] = "renew token";

constexpr int TimestampValidityMinutes = 10;

void ValidateLifetime(long long lifetime)
{
    if (lifetime <= 0) {
        throw Quillon::InvalidArgumentException("Token lifetime must be positive");
    }
}

void ValidateTokenIsHok(const SamlToken& token, const std::string& operationName)
{
    if (token.GetConfirmationMethod() != SamlToken::CONFIRM_HOLDER_OF_KEY) {
        throw Quillon::InvalidArgumentException(
            "Unable to " + operationName + ": the provided token must be Holder Of Key");
    }
}

// A key that no certificate speaks for proves nothing, nor does a certificate without its key: half
// an identity is none.
boost::optional<HolderOfKeyConfig> GetWhole(const boost::optional<HolderOfKeyConfig>& config)
{
    const bool isWhole = config && config->privateKey && config->certificate;
    return isWhole ? config : boost::none;
}

// A request that delegates goes unsigned, whatever its body asks for.
TokenSpec::Confirmation ConfOverrideWithDelegate(const TokenSpec& spec)
{
    return spec.delegateTo ? TokenSpec::CONFIRMATION_BEARER : spec.confirmation;
}

XMLBuilderPtr CreateHeader()
{
    return WsSecurityHeaderBuilder(TimestampValidityMinutes);
}

XMLBuilderPtr CreateHeader(XMLBuilderPtr credentials)
{
    return Composite(CreateHeader(), {std::move(credentials)});
}

std::string SerializeToXML(const XMLBaseBuilder& builder)
{
    Quillon::Ref<Quillon::Xml::ElementNode> root;
    builder.build(root);
    const Quillon::Ref<Quillon::StringWriter> writer = Quillon::CreateStringWriter();
    Quillon::Xml::Serialize(root.get(), writer.get());
    return writer->TakeString();
}

std::string BuildUnSignedRequest(XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder)
{
    return SerializeToXML(*SoapBuilder(std::move(headerBuilder), std::move(bodyBuilder)));
}

} // namespace

RequestBuilderImpl::RequestBuilderImpl(const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig)
    : _holderOfKeyConfig(GetWhole(holderOfKeyConfig))
{}

void RequestBuilderImpl::BuildUserPassTokenRequest(
    const std::string& userName,
    const std::string& password,
    const TokenSpec& spec,
    Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    XMLBuilderPtr header = CreateHeader(WsseUsernameTokenBuilder(userName, password));
    XMLBuilderPtr body =
        AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
    request.soapAction = Wire::IssueAction;
    request.body =
        BuildTokenRequest(ConfOverrideWithDelegate(spec), std::move(header), std::move(body));
}

void RequestBuilderImpl::BuildInitialSPNegoRequest(
    const TokenSpec& spec, const Leg& leg, Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    XMLBuilderPtr header = CreateHeader();
    XMLBuilderPtr body = boost::make_shared<XMLBodyBuilderInitialSPNego>(
        GetEffectiveConfirmationType(spec.confirmation), spec, leg);
    request.soapAction = Wire::IssueAction;
    request.body =
        BuildTokenRequest(ConfOverrideWithDelegate(spec), std::move(header), std::move(body));
}

void RequestBuilderImpl::BuildContinuedSPNegoRequest(
    const std::string& contextId, const Leg& leg, Request& request) const
{
    XMLBuilderPtr header = CreateHeader();
    XMLBuilderPtr body = boost::make_shared<XMLBodyBuilderContinuedSPNego>(contextId, leg);
    request.soapAction = Wire::IssueResponseAction;
    request.body = BuildUnSignedRequest(std::move(header), std::move(body));
}

void RequestBuilderImpl::BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    ValidateHokIsConfigured(AcquireByCertificate);
    if (spec.confirmation != TokenSpec::CONFIRMATION_DEFAULT) {
        throw Quillon::InvalidArgumentException(
            std::string("TokenSpec::confirmation must be CONFIRMATION_DEFAULT for ")
            + AcquireByCertificate);
    }
    XMLBuilderPtr header = CreateHeader();
    XMLBuilderPtr body =
        AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
    request.soapAction = Wire::IssueAction;
    request.body = BuildCertRefSignedRequest(std::move(header), std::move(body));
}

void RequestBuilderImpl::BuildExchangeTokenRequest(
    const SamlToken& token, const TokenSpec& spec, Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    ValidateHokIsConfigured(AcquireByToken);
    XMLBuilderPtr header = CreateHeader(InsertSamlTokenBuilder(token));
    XMLBuilderPtr body =
        ExchangeSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
    request.soapAction = Wire::IssueAction;
    request.body = BuildSamlRefSignedRequest(token.GetId(), std::move(header), std::move(body));
}

void RequestBuilderImpl::BuildValidateSubjectRequest(const SamlToken& token, Request& request) const
{
    request.soapAction = Wire::ValidateAction;
    XMLBuilderPtr body = ValidateSecurityTokenBuilder(token);
    request.body = BuildUnSignedRequest(CreateHeader(), std::move(body));
}

void RequestBuilderImpl::BuildRenewRequest(
    const SamlToken& token, long long lifetimeSec, Request& request) const
{
    ValidateLifetime(lifetimeSec);
    ValidateHokIsConfigured(Renew);
    ValidateTokenIsHok(token, Renew);
    XMLBuilderPtr header = CreateHeader();
    XMLBuilderPtr body = RenewSecurityTokenBuilder(token, lifetimeSec);
    request.soapAction = Wire::RenewAction;
    request.body = BuildCertRefSignedRequest(std::move(header), std::move(body));
}

void RequestBuilderImpl::ValidateHokIsConfigured(const std::string& operationName) const
{
    if (!_holderOfKeyConfig) {
        throw Quillon::InvalidStateException(
            "No HolderOfKeyConfig provided. Unable to " + operationName);
    }
}

SamlToken::ConfirmationType RequestBuilderImpl::GetEffectiveConfirmationType(
    TokenSpec::Confirmation confirmation) const
{
    return _holderOfKeyConfig && confirmation == TokenSpec::CONFIRMATION_DEFAULT
               ? SamlToken::CONFIRM_HOLDER_OF_KEY
               : SamlToken::CONFIRM_BEARER;
}

std::string RequestBuilderImpl::BuildTokenRequest(
    TokenSpec::Confirmation confirmation,
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder) const
{
    return GetEffectiveConfirmationType(confirmation) == SamlToken::CONFIRM_HOLDER_OF_KEY
               ? BuildCertRefSignedRequest(std::move(headerBuilder), std::move(bodyBuilder))
               : BuildUnSignedRequest(std::move(headerBuilder), std::move(bodyBuilder));
}

std::string RequestBuilderImpl::BuildCertRefSignedRequest(
    XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder) const
{
    const HolderOfKeyConfig& identity = GetHolderOfKeyConfig();
    return SerializeToXML(*CertRefSignedSoapBuilder(
        std::move(headerBuilder),
        std::move(bodyBuilder),
        identity.privateKey.get(),
        identity.certificate.get()));
}

std::string RequestBuilderImpl::BuildSamlRefSignedRequest(
    const std::string& tokenId, XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder) const
{
    return SerializeToXML(*SamlRefSignedSoapBuilder(
        std::move(headerBuilder),
        std::move(bodyBuilder),
        GetHolderOfKeyConfig().privateKey.get(),
        tokenId));
}

const HolderOfKeyConfig& RequestBuilderImpl::GetHolderOfKeyConfig() const
{
    if (!_holderOfKeyConfig.is_initialized()) {
        Quillon::PanicVerify(
            "_holderOfKeyConfig.is_initialized()",
            AssertionPlaces::RequestBuilderImpl,
            AssertionPlaces::SigningWithoutIdentity);
    }
    return *_holderOfKeyConfig;
}

} // namespace SsoClient
