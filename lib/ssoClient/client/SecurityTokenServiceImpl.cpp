#include "ssoClient/client/SecurityTokenServiceImpl.h"

#include "quillon/MessageFormatter.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/client/asyncCalls.h"
#include "ssoClient/client/descriptions.h"
#include "ssoClient/client/negotiation.h"
#include "ssoClient/client/operation.h"
#include "ssoClient/client/tokenReading.h"
#include "ssoClient/client/trustedCertificates.h"

#include <boost/none.hpp>
#include <boost/smart_ptr/make_shared.hpp>

using Quillon::MessageFormatter;

namespace SsoClient {

namespace {

std::string DescribeRequest(const TokenSpec& spec)
{
    return MessageFormatter::ASPrint("Requested token with spec `%1'", WriteTokenSpec(spec));
}

} // namespace

SecurityTokenServiceImpl::SecurityTokenServiceImpl(
    const boost::shared_ptr<const RequestBuilder>& requestBuilder,
    const boost::shared_ptr<const Transport>& transport,
    const boost::shared_ptr<const ResponseHandler>& responseHandler,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
    const boost::optional<ServiceDialect>& dialect,
    const boost::optional<HolderOfKeyConfig>& identity)
    : _requestBuilder(requestBuilder)
    , _transport(transport)
    , _responseHandler(responseHandler)
    , _trustedCertificates(trustedCertificates)
    , _dialect(dialect)
    , _identity(identity)
{}

template <class Describe, class Build, class Read>
boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::RunForToken(
    const char* operationName,
    const GrantRequest& asked,
    const Describe& describe,
    const Build& build,
    const Read& read) const
{
    return Run(
        GetRoad(),
        operationName,
        describe,
        [&](Request& request) {
            build(request);
            RefuseNullCertificate(_trustedCertificates);
        },
        [&](const ResponseHandler& handler, Quillon::Reader* reply) {
            std::string tokenXml;
            read(handler, reply, tokenXml);
            return ToSamlToken(tokenXml, asked);
        });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireToken(
    const std::string& userName, const std::string& password, const TokenSpec& spec) const
{
    return RunForToken(
        "AcquireToken",
        GrantRequest::ByPassword(userName, spec),
        [&] {
            return MessageFormatter::ASPrint(
                "Requested token for subject `%1', spec `%2'", userName, WriteTokenSpec(spec));
        },
        [&](Request& request) {
            _requestBuilder->BuildUserPassTokenRequest(userName, password, spec, request);
            RefuseNullCertificate(_trustedCertificates);
            LogTrace([] { return "SecurityTokenServiceImpl::AcquireToken sending request"; });
        },
        [&](const ResponseHandler& handler, Quillon::Reader* reply, std::string& tokenXml) {
            LogTrace([] { return "SecurityTokenServiceImpl::AcquireToken processing response"; });
            handler.HandleAcquireTokenResponse(reply, tokenXml);
        });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByGSS(
    const TokenSpec& spec, NegotiationHandler& handler) const
{
    return Run(
        _control.get(),
        "AcquireTokenByGSS",
        [&] { return DescribeRequest(spec); },
        [&](Call& call) {
            const boost::shared_ptr<const ResponseHandler> replies = call.Observe(_responseHandler);
            const LegDriver legs(
                *_requestBuilder,
                *replies,
                _trustedCertificates,
                LegDriver::EmptyLeg::STOPS_THE_PROCESS);
            const boost::shared_ptr<TransportSession> session =
                call.CreateSession(*_transport, true);
            return ToSamlToken(
                Negotiate(call, legs, *session, spec, handler), GrantRequest::ByNegotiation(spec));
        });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByCertificate(
    const TokenSpec& spec) const
{
    return RunForToken(
        "AcquireTokenByCertificate",
        GrantRequest::ByCertificate(spec),
        [&] { return DescribeRequest(spec); },
        [&](Request& request) { _requestBuilder->BuildCertificateTokenRequest(spec, request); },
        [&](const ResponseHandler& handler, Quillon::Reader* reply, std::string& tokenXml) {
            handler.HandleAcquireTokenResponse(reply, tokenXml);
        });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByToken(
    const SamlToken& token, const TokenSpec& spec) const
{
    return RunForToken(
        "AcquireTokenByToken",
        GrantRequest::ByToken(token, spec),
        [&] {
            return MessageFormatter::ASPrint(
                "Requested token for %1 with spec `%2'",
                CreateRedactedDescription(token),
                WriteTokenSpec(spec));
        },
        [&](Request& request) { _requestBuilder->BuildExchangeTokenRequest(token, spec, request); },
        [&](const ResponseHandler& handler, Quillon::Reader* reply, std::string& tokenXml) {
            handler.HandleAcquireTokenResponse(reply, tokenXml);
        });
}

bool SecurityTokenServiceImpl::ValidateSubject(const SamlToken& token) const
{
    return Run(
        GetRoad(),
        "ValidateSubject",
        [&] {
            return MessageFormatter::ASPrint(
                "Validating subject of token %1", CreateRedactedDescription(token));
        },
        [&](Request& request) { _requestBuilder->BuildValidateSubjectRequest(token, request); },
        [&](const ResponseHandler& handler, Quillon::Reader* reply) {
            const bool result = handler.HandleValidateSubjectResponse(reply);
            LogTrace([result] { return MessageFormatter::ASPrint("Result: %1", result); });
            return result;
        });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::RenewToken(
    const SamlToken& token, long long lifetimeSec) const
{
    return RunForToken(
        "RenewToken",
        GrantRequest::ByRenewal(token, lifetimeSec),
        [&] {
            return MessageFormatter::ASPrint(
                "Renewing token %1 for %2 more seconds",
                CreateRedactedDescription(token),
                lifetimeSec);
        },
        [&](Request& request) { _requestBuilder->BuildRenewRequest(token, lifetimeSec, request); },
        [&](const ResponseHandler& handler, Quillon::Reader* reply, std::string& tokenXml) {
            handler.HandleRenewTokenResponse(reply, tokenXml);
        });
}

template <class Call, class... Rest>
void SecurityTokenServiceImpl::Queue(const Call& call, const Rest&... rest) const
{
    if (_control == nullptr) {
        SyncToAsyncCall(call, rest...);
    } else {
        SyncToCancellableCall(_control->options.cancellation, call, rest...);
    }
}

void SecurityTokenServiceImpl::AcquireTokenAsync(
    const std::string& userName,
    const std::string& password,
    const TokenSpec& spec,
    const TokenCompletion& completion) const
{
    Queue(
        TokenCall(boost::bind(
            &SecurityTokenService::AcquireToken, Copy(), userName, PassSecret(password), spec)),
        completion);
}

void SecurityTokenServiceImpl::AcquireTokenByGssAsync(
    const TokenSpec& spec,
    const boost::shared_ptr<NegotiationHandler>& handler,
    const TokenCompletion& completion) const
{
    Queue(
        TokenCall(boost::bind(
            &SecurityTokenService::AcquireTokenByGSS, Copy(), spec, PassByRef(handler))),
        completion);
}

void SecurityTokenServiceImpl::AcquireTokenByCertificateAsync(
    const TokenSpec& spec, const TokenCompletion& completion) const
{
    Queue(
        TokenCall(boost::bind(&SecurityTokenService::AcquireTokenByCertificate, Copy(), spec)),
        completion);
}

void SecurityTokenServiceImpl::AcquireTokenByTokenAsync(
    const boost::shared_ptr<const SamlToken>& token,
    const TokenSpec& spec,
    const TokenCompletion& completion) const
{
    Queue(
        TokenCall(boost::bind(
            &SecurityTokenService::AcquireTokenByToken, Copy(), PassByRef(token), spec)),
        completion);
}

void SecurityTokenServiceImpl::ValidateSubjectAsync(
    const boost::shared_ptr<const SamlToken>& token, const ValidationCompletion& completion) const
{
    Queue(
        ValidationCall(
            boost::bind(&SecurityTokenService::ValidateSubject, Copy(), PassByRef(token))),
        completion,
        boost::optional<bool>(boost::none));
}

void SecurityTokenServiceImpl::RenewTokenAsync(
    const boost::shared_ptr<const SamlToken>& token,
    long long lifetimeSec,
    const TokenCompletion& completion) const
{
    Queue(
        TokenCall(
            boost::bind(&SecurityTokenService::RenewToken, Copy(), PassByRef(token), lifetimeSec)),
        completion);
}

boost::shared_ptr<SecurityTokenService> SecurityTokenServiceImpl::UnderControl(
    const CallControl& control) const
{
    const auto copy = boost::make_shared<SecurityTokenServiceImpl>(*this);
    copy->_transport = _transport->WithReuse(control.options.connectionReuse);
    copy->_control = boost::make_shared<const CallControl>(control);
    return copy;
}

boost::shared_ptr<SecurityTokenService> SecurityTokenServiceImpl::Trusting(
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& certificates) const
{
    const auto copy = boost::make_shared<SecurityTokenServiceImpl>(*this);
    copy->_trustedCertificates = certificates;
    return copy;
}

boost::shared_ptr<const SecurityTokenService> SecurityTokenServiceImpl::Copy() const
{
    const auto copy = boost::make_shared<SecurityTokenServiceImpl>(*this);
    if (_control != nullptr) {
        copy->_control = boost::make_shared<const CallControl>(_control->Started());
    }
    return copy;
}

Road SecurityTokenServiceImpl::GetRoad() const noexcept
{
    return {_control.get(), *_transport, _responseHandler};
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::ToSamlToken(
    const std::string& tokenXml, const GrantRequest& asked) const
{
    if (tokenXml.empty()) {
        return nullptr;
    }
    boost::shared_ptr<const SamlToken> token;
    try {
        token =
            ReadToken(tokenXml, _trustedCertificates, _dialect ? _dialect->reading : boost::none);
    } catch (const ParseException& error) {
        // The caller's own tokens are fine: it is the service that answered with a bad one.
        throw SsoException(error.what());
    }
    if (_dialect) {
        CheckGrant(*token, asked, *_dialect, _identity);
    }
    LogTrace([&token] {
        return MessageFormatter::ASPrint(
            "Successfully acquired token: %1", CreateRedactedDescription(*token));
    });
    return token;
}

const SecurityTokenServiceImpl& RequireOwn(
    const boost::shared_ptr<const SecurityTokenService>& service)
{
    const auto* const own = dynamic_cast<const SecurityTokenServiceImpl*>(service.get());
    if (own == nullptr) {
        throw Quillon::InvalidArgumentException(
            service == nullptr ? "There is no service."
                               : "The service is not one that this library made.");
    }
    return *own;
}

} // namespace SsoClient
