#include "ssoClient/client/SecurityTokenServiceImpl.h"

#include "quillon/MessageFormatter.h"
#include "quillon/PanicVerify.h"
#include "quillon/StringUtil.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/client/asyncCalls.h"
#include "ssoClient/client/descriptions.h"
#include "ssoClient/client/logging.h"
#include "ssoClient/protocol/HttpsClient.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"
#include "ssoClient/wire/WipedText.h"

#include <boost/none.hpp>
#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

using Quillon::MessageFormatter;

namespace SsoClient {

namespace {

constexpr char Unit[] = "lib/ssoClient/SecurityTokenServiceImpl";
constexpr long long SendTimeoutMicroseconds = 240'000'000;

// Marks the begin and, however it is left, the end of an operation in the log.
class OperationFrame
{
public:
    explicit OperationFrame(std::string operationName)
        : _opId(Quillon::StringUtil::GenerateUuid())
        , _operationName(std::move(operationName))
    {
        LogTrace([this] { return Describe("START"); });
    }

    OperationFrame(const OperationFrame&) = delete;
    OperationFrame& operator=(const OperationFrame&) = delete;

    ~OperationFrame()
    {
        try {
            LogTrace([this] { return Describe("END"); });
        } catch (const std::exception&) { // NOLINT(bugprone-empty-catch)
            // Out of memory for one log line; the operation has its own outcome to report.
        }
    }

private:
    std::string Describe(const char* step) const
    {
        return MessageFormatter::ASPrint(
            "opId=%1 %2 operation SecurityTokenServiceImpl::%3", _opId, step, _operationName);
    }

    std::string _opId;
    std::string _operationName;
};

// The handler has to see the service's last leg, for with it the service proves itself. What it
// answers is not sent. The test is the way round that log readers know, not the way of its text.
void ConsumeFinalLeg(const Leg& serverLeg, NegotiationHandler& handler)
{
    if (serverLeg.empty()) {
        return;
    }
    const boost::shared_ptr<Leg> userLeg = handler.Negotiate(serverLeg);
    if (userLeg == nullptr || userLeg->empty()) {
        getLogger()->Log(
            Quillon::Service::LOG_LEVEL_WARNING,
            "GSS contract error: non-empty user leg after negotiation is complete");
    }
}

// Keeps what `_p` points to alive inside a bound call, and hands it over by reference.
template <class T>
class PassByRefHelper
{
public:
    explicit PassByRefHelper(const boost::shared_ptr<T>& p)
        : _p(p)
    {
        if (_p == nullptr) {
            Quillon::PanicVerify("_p", Unit, 488);
        }
    }

    operator T&() const noexcept { return *_p; } // NOLINT(google-explicit-constructor)

private:
    boost::shared_ptr<T> _p;
};

template <class T>
PassByRefHelper<T> PassByRef(const boost::shared_ptr<T>& p)
{
    return PassByRefHelper<T>(p);
}

// Bound calls are copied on their way to the pool; the copies share the one password.
PassByRefHelper<const std::string> PassSecret(const std::string& secret)
{
    const boost::shared_ptr<WipedText> copy = boost::make_shared<WipedText>(secret);
    return PassByRef(boost::shared_ptr<const std::string>(copy, &copy->text));
}

} // namespace

SecurityTokenServiceImpl::SecurityTokenServiceImpl(
    const boost::shared_ptr<const RequestBuilder>& requestBuilder,
    const boost::shared_ptr<const Transport>& transport,
    const boost::shared_ptr<const ResponseHandler>& responseHandler,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates)
    : _requestBuilder(requestBuilder)
    , _transport(transport)
    , _responseHandler(responseHandler)
    , _trustedCertificates(trustedCertificates)
{}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireToken(
    const std::string& userName, const std::string& password, const TokenSpec& spec) const
{
    const OperationFrame frame("AcquireToken");
    LogTrace([&] {
        return MessageFormatter::ASPrint(
            "Requested token for subject `%1', spec `%2'", userName, WriteTokenSpec(spec));
    });
    Request request;
    _requestBuilder->BuildUserPassTokenRequest(userName, password, spec, request);
    LogTrace([] { return "SecurityTokenServiceImpl::AcquireToken sending request"; });
    const Quillon::Ref<Quillon::Reader> reply = Send(request);
    LogTrace([] { return "SecurityTokenServiceImpl::AcquireToken processing response"; });
    std::string tokenXml;
    _responseHandler->HandleAcquireTokenResponse(reply.get(), tokenXml);
    return ToSamlToken(tokenXml);
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByGSS(
    const TokenSpec& spec, NegotiationHandler& handler) const
{
    const OperationFrame frame("AcquireTokenByGSS");
    LogTrace([&spec] {
        return MessageFormatter::ASPrint("Requested token with spec `%1'", WriteTokenSpec(spec));
    });
    const boost::shared_ptr<TransportSession> session = _transport->CreateSession();
    SPNegoResponse response;
    do {
        ExchangeLegs(*session, spec, handler, response);
    } while (response.token.empty());
    ConsumeFinalLeg(response.leg, handler);
    return ToSamlToken(response.token);
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByCertificate(
    const TokenSpec& spec) const
{
    const OperationFrame frame("AcquireTokenByCertificate");
    LogTrace([&spec] {
        return MessageFormatter::ASPrint("Requested token with spec `%1'", WriteTokenSpec(spec));
    });
    Request request;
    _requestBuilder->BuildCertificateTokenRequest(spec, request);
    std::string tokenXml;
    _responseHandler->HandleAcquireTokenResponse(Send(request).get(), tokenXml);
    return ToSamlToken(tokenXml);
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByToken(
    const SamlToken& token, const TokenSpec& spec) const
{
    const OperationFrame frame("AcquireTokenByToken");
    LogTrace([&] {
        return MessageFormatter::ASPrint(
            "Requested token for %1 with spec `%2'",
            CreateRedactedDescription(token),
            WriteTokenSpec(spec));
    });
    Request request;
    _requestBuilder->BuildExchangeTokenRequest(token, spec, request);
    std::string tokenXml;
    _responseHandler->HandleAcquireTokenResponse(Send(request).get(), tokenXml);
    return ToSamlToken(tokenXml);
}

bool SecurityTokenServiceImpl::ValidateSubject(const SamlToken& token) const
{
    const OperationFrame frame("ValidateSubject");
    LogTrace([&token] {
        return MessageFormatter::ASPrint(
            "Validating subject of token %1", CreateRedactedDescription(token));
    });
    Request request;
    _requestBuilder->BuildValidateSubjectRequest(token, request);
    const bool result = _responseHandler->HandleValidateSubjectResponse(Send(request).get());
    LogTrace([result] { return MessageFormatter::ASPrint("Result: %1", result); });
    return result;
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::RenewToken(
    const SamlToken& token, long long lifetimeSec) const
{
    const OperationFrame frame("RenewToken");
    LogTrace([&] {
        return MessageFormatter::ASPrint(
            "Renewing token %1 for %2 more seconds", CreateRedactedDescription(token), lifetimeSec);
    });
    Request request;
    _requestBuilder->BuildRenewRequest(token, lifetimeSec, request);
    std::string tokenXml;
    _responseHandler->HandleRenewTokenResponse(Send(request).get(), tokenXml);
    return ToSamlToken(tokenXml);
}

void SecurityTokenServiceImpl::AcquireTokenAsync(
    const std::string& userName,
    const std::string& password,
    const TokenSpec& spec,
    const TokenCompletion& completion) const
{
    SyncToAsyncCall(
        TokenCall(boost::bind(
            &SecurityTokenService::AcquireToken, Copy(), userName, PassSecret(password), spec)),
        completion);
}

void SecurityTokenServiceImpl::AcquireTokenByGssAsync(
    const TokenSpec& spec,
    const boost::shared_ptr<NegotiationHandler>& handler,
    const TokenCompletion& completion) const
{
    SyncToAsyncCall(
        TokenCall(boost::bind(
            &SecurityTokenService::AcquireTokenByGSS, Copy(), spec, PassByRef(handler))),
        completion);
}

void SecurityTokenServiceImpl::AcquireTokenByCertificateAsync(
    const TokenSpec& spec, const TokenCompletion& completion) const
{
    SyncToAsyncCall(
        TokenCall(boost::bind(&SecurityTokenService::AcquireTokenByCertificate, Copy(), spec)),
        completion);
}

void SecurityTokenServiceImpl::AcquireTokenByTokenAsync(
    const boost::shared_ptr<const SamlToken>& token,
    const TokenSpec& spec,
    const TokenCompletion& completion) const
{
    SyncToAsyncCall(
        TokenCall(boost::bind(
            &SecurityTokenService::AcquireTokenByToken, Copy(), PassByRef(token), spec)),
        completion);
}

void SecurityTokenServiceImpl::ValidateSubjectAsync(
    const boost::shared_ptr<const SamlToken>& token, const ValidationCompletion& completion) const
{
    SyncToAsyncCall(
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
    SyncToAsyncCall(
        TokenCall(
            boost::bind(&SecurityTokenService::RenewToken, Copy(), PassByRef(token), lifetimeSec)),
        completion);
}

boost::shared_ptr<const SecurityTokenService> SecurityTokenServiceImpl::Copy() const
{
    return boost::make_shared<SecurityTokenServiceImpl>(*this);
}

void SecurityTokenServiceImpl::ExchangeLegs(
    TransportSession& session,
    const TokenSpec& spec,
    NegotiationHandler& handler,
    SPNegoResponse& response) const
{
    const boost::shared_ptr<Leg> userLeg = handler.Negotiate(response.leg);
    if (userLeg == nullptr) {
        throw Quillon::InvalidArgumentException(
            "Invalid NegotiationHandler: the returned leg may not be NULL");
    }
    if (response.contextId.empty()) {
        StartSPNegotiation(session, *userLeg, spec, response);
    } else {
        ContinueSPNegotiation(session, *userLeg, response.contextId, response);
    }
    if (response.contextId.empty()) {
        throw CommunicationException("Error processing the response to SPNego token request: no "
                                     "Context ID was returned.");
    }
}

void SecurityTokenServiceImpl::StartSPNegotiation(
    TransportSession& session,
    const Leg& leg,
    const TokenSpec& spec,
    SPNegoResponse& response) const
{
    if (leg.empty()) {
        Quillon::PanicVerify("!leg.empty()", Unit, 762);
    }
    Request request;
    _requestBuilder->BuildInitialSPNegoRequest(spec, leg, request);
    SendLeg(session, request, response);
}

void SecurityTokenServiceImpl::ContinueSPNegotiation(
    TransportSession& session,
    const Leg& leg,
    const std::string& contextId,
    SPNegoResponse& response) const
{
    if (leg.empty()) {
        Quillon::PanicVerify("!leg.empty()", Unit, 794);
    }
    Request request;
    _requestBuilder->BuildContinuedSPNegoRequest(contextId, leg, request);
    SendLeg(session, request, response);
}

void SecurityTokenServiceImpl::SendLeg(
    TransportSession& session, const Request& request, SPNegoResponse& response) const
{
    Quillon::Ref<Quillon::Reader> reply;
    session.SendRequest(request, reply);
    _responseHandler->HandleSPNegoResponse(reply.get(), response);
}

Quillon::Ref<Quillon::Reader> SecurityTokenServiceImpl::Send(const Request& request) const
{
    Quillon::Ref<Quillon::Reader> reply;
    _transport->CreateSession()->SendRequest(request, reply);
    return reply;
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::ToSamlToken(
    const std::string& tokenXml) const
{
    if (tokenXml.empty()) {
        return nullptr;
    }
    boost::shared_ptr<const SamlToken> token;
    try {
        token = CreateSamlToken(tokenXml, _trustedCertificates);
    } catch (const ParseException& error) {
        // The caller's own tokens are fine: it is the service that answered with a bad one.
        throw SsoException(error.what());
    }
    LogTrace([&token] {
        return MessageFormatter::ASPrint(
            "Successfully acquired token: %1", CreateRedactedDescription(*token));
    });
    return token;
}

boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config)
{
    return boost::make_shared<SecurityTokenServiceImpl>(
        boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig),
        boost::make_shared<HttpsClient>(
            config.url, config.sslContext, config.sslPeerParameter, SendTimeoutMicroseconds),
        boost::make_shared<ResponseHandlerImpl>(),
        config.trustedCertificates);
}

} // namespace SsoClient
