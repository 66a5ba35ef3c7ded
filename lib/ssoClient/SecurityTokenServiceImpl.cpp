#include "ssoClient/SecurityTokenServiceImpl.h"

#include "quillon/MessageFormatter.h"
#include "quillon/StringUtil.h"
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/HttpsClient.h"
#include "ssoClient/RequestBuilderImpl.h"
#include "ssoClient/ResponseHandlerImpl.h"
#include "ssoClient/descriptions.h"
#include "ssoClient/logging.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

using Quillon::MessageFormatter;

namespace SsoClient {

namespace {

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
