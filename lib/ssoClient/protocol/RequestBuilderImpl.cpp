#include "ssoClient/protocol/RequestBuilderImpl.h"

#include "quillon/Exceptions.h"
#include "quillon/PanicVerify.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/dialect/trustNames.h"
#include "ssoClient/message/xmlAddressingBuilders.h"
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

} // namespace

RequestBuilderImpl::RequestBuilderImpl(
    const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig, RequestForm form)
    : _holderOfKeyConfig(GetWhole(holderOfKeyConfig))
    , _form(std::move(form))
{}

void RequestBuilderImpl::BuildUserPassTokenRequest(
    const std::string& userName,
    const std::string& password,
    const TokenSpec& spec,
    Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    XMLBuilderPtr header = CreateHeader(WsseUsernameTokenBuilder(userName, password));
    XMLBuilderPtr body = AcquireSecurityTokenBuilder(
        GetEffectiveConfirmationType(spec.confirmation),
        spec,
        GetIssueForm(CertificateReferenceBuilder()));
    SetAction(GetTrustNames().issueAction, request);
    BuildTokenRequest(ConfOverrideWithDelegate(spec), std::move(header), std::move(body), request);
}

void RequestBuilderImpl::BuildInitialSPNegoRequest(
    const TokenSpec& spec, const Leg& leg, Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    XMLBuilderPtr header = CreateHeader();
    XMLBuilderPtr body = boost::make_shared<XMLBodyBuilderInitialSPNego>(
        GetEffectiveConfirmationType(spec.confirmation),
        spec,
        leg,
        GetIssueForm(CertificateReferenceBuilder()));
    SetAction(GetTrustNames().issueAction, request);
    BuildTokenRequest(ConfOverrideWithDelegate(spec), std::move(header), std::move(body), request);
}

void RequestBuilderImpl::BuildContinuedSPNegoRequest(
    const std::string& contextId, const Leg& leg, Request& request) const
{
    XMLBuilderPtr header = CreateHeader();
    XMLBuilderPtr body = boost::make_shared<XMLBodyBuilderContinuedSPNego>(contextId, leg);
    SetAction(GetTrustNames().issueResponseAction, request);
    BuildUnSignedRequest(std::move(header), std::move(body), request);
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
    XMLBuilderPtr body = AcquireSecurityTokenBuilder(
        GetEffectiveConfirmationType(spec.confirmation),
        spec,
        GetIssueForm(CertificateReferenceBuilder()));
    SetAction(GetTrustNames().issueAction, request);
    BuildCertRefSignedRequest(std::move(header), std::move(body), request);
}

void RequestBuilderImpl::BuildExchangeTokenRequest(
    const SamlToken& token, const TokenSpec& spec, Request& request) const
{
    ValidateLifetime(spec.tokenLifetimeSec);
    if (_form.dialect.presentedToken == PresentedTokenForm::IN_HEADER) {
        BuildRequestWithTokenInHeader(token, spec, request);
    } else {
        BuildRequestWithTokenInBody(token, spec, request);
    }
}

void RequestBuilderImpl::BuildRequestWithTokenInHeader(
    const SamlToken& token, const TokenSpec& spec, Request& request) const
{
    ValidateHokIsConfigured(AcquireByToken);
    XMLBuilderPtr header = CreateHeader(InsertSamlTokenBuilder(token));
    XMLBuilderPtr body = ExchangeSecurityTokenBuilder(
        GetEffectiveConfirmationType(spec.confirmation),
        spec,
        GetIssueForm(WsseSamlKeyIdReferenceBuilder(token.GetId(), GetSamlTokenType())));
    SetAction(GetTrustNames().issueAction, request);
    BuildSamlRefSignedRequest(token.GetId(), std::move(header), std::move(body), request);
}

// The token proves nothing of who asks, so the caller's own credentials do.
void RequestBuilderImpl::BuildRequestWithTokenInBody(
    const SamlToken& token, const TokenSpec& spec, Request& request) const
{
    if (!_form.credentials) {
        ValidateHokIsConfigured(AcquireByToken);
    }
    XMLBuilderPtr header = CreateHeaderWithCredentials();
    auto body = AcquireSecurityTokenBuilder(
        GetEffectiveConfirmationType(spec.confirmation),
        spec,
        GetIssueForm(CertificateReferenceBuilder()));
    body->Add(WstDelegatingTokenBuilder(_form.dialect.presentedToken, token));
    SetAction(GetTrustNames().issueAction, request);
    if (_form.credentials) {
        BuildTokenRequest(ConfOverrideWithDelegate(spec), std::move(header), body, request);
    } else {
        BuildCertRefSignedRequest(std::move(header), body, request);
    }
}

void RequestBuilderImpl::BuildValidateSubjectRequest(const SamlToken& token, Request& request) const
{
    SetAction(GetTrustNames().validateAction, request);
    XMLBuilderPtr body = ValidateSecurityTokenBuilder(token, _form.dialect.trust);
    const bool proves = _form.dialect.validatesWithCredentials;
    if (proves && !_form.credentials && _holderOfKeyConfig) {
        BuildCertRefSignedRequest(CreateHeader(), std::move(body), request);
        return;
    }
    BuildUnSignedRequest(
        proves ? CreateHeaderWithCredentials() : CreateHeader(), std::move(body), request);
}

void RequestBuilderImpl::BuildRenewRequest(
    const SamlToken& token, long long lifetimeSec, Request& request) const
{
    ValidateLifetime(lifetimeSec);
    ValidateHokIsConfigured(Renew);
    ValidateTokenIsHok(token, Renew);
    XMLBuilderPtr header = CreateHeaderWithCredentials();
    XMLBuilderPtr body = RenewSecurityTokenBuilder(token, lifetimeSec, _form.dialect.trust);
    SetAction(GetTrustNames().renewAction, request);
    BuildCertRefSignedRequest(std::move(header), std::move(body), request);
}

XMLBuilderPtr RequestBuilderImpl::CreateHeaderWithCredentials() const
{
    return _form.credentials ? CreateHeader(
               WsseUsernameTokenBuilder(_form.credentials->userName, _form.credentials->password))
                             : CreateHeader();
}

IssueForm RequestBuilderImpl::GetIssueForm(XMLBuilderPtr keyReference) const
{
    IssueForm form;
    form.dialect = _form.dialect;
    if (_form.dialect.useKey == UseKeyForm::REFERENCE) {
        form.useKeyContent = std::move(keyReference);
    } else if (_form.dialect.useKey == UseKeyForm::CERTIFICATE && _holderOfKeyConfig) {
        form.useKeyContent = DsCertificateKeyInfoBuilder(_holderOfKeyConfig->certificate.get());
    }
    return form;
}

EnvelopeForm RequestBuilderImpl::GetEnvelopeForm(const Request& request) const
{
    EnvelopeForm form;
    form.soap = _form.dialect.soap;
    form.trust = _form.dialect.trust;
    form.signatureScope = _form.dialect.signatureScope;
    if (_form.dialect.addressing) {
        form.addressing = WsaHeaderBuilders(request.soapAction, _form.url);
    }
    return form;
}

void RequestBuilderImpl::SetAction(const char* action, Request& request) const
{
    request.soapAction = action;
    request.soap = _form.dialect.soap;
}

const char* RequestBuilderImpl::GetSamlTokenType() const noexcept
{
    return _form.dialect.hyphenInSamlTokenType ? Wire::Saml20TokenTypeWithHyphen
                                               : Wire::Saml20TokenType;
}

const Wire::TrustNames& RequestBuilderImpl::GetTrustNames() const noexcept
{
    return Wire::GetTrustNames(_form.dialect.trust);
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

void RequestBuilderImpl::BuildTokenRequest(
    TokenSpec::Confirmation confirmation,
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    Request& request) const
{
    if (GetEffectiveConfirmationType(confirmation) == SamlToken::CONFIRM_HOLDER_OF_KEY) {
        BuildCertRefSignedRequest(std::move(headerBuilder), std::move(bodyBuilder), request);
    } else {
        BuildUnSignedRequest(std::move(headerBuilder), std::move(bodyBuilder), request);
    }
}

void RequestBuilderImpl::BuildUnSignedRequest(
    XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder, Request& request) const
{
    request.body = SerializeToXML(
        *SoapBuilder(std::move(headerBuilder), std::move(bodyBuilder), GetEnvelopeForm(request)));
}

void RequestBuilderImpl::BuildCertRefSignedRequest(
    XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder, Request& request) const
{
    const HolderOfKeyConfig& identity = GetHolderOfKeyConfig();
    request.body = SerializeToXML(*CertRefSignedSoapBuilder(
        std::move(headerBuilder),
        std::move(bodyBuilder),
        identity.privateKey.get(),
        identity.certificate.get(),
        GetEnvelopeForm(request)));
}

void RequestBuilderImpl::BuildSamlRefSignedRequest(
    const std::string& tokenId,
    XMLBuilderPtr headerBuilder,
    XMLBuilderPtr bodyBuilder,
    Request& request) const
{
    request.body = SerializeToXML(*SamlRefSignedSoapBuilder(
        std::move(headerBuilder),
        std::move(bodyBuilder),
        GetHolderOfKeyConfig().privateKey.get(),
        tokenId,
        GetSamlTokenType(),
        GetEnvelopeForm(request)));
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
