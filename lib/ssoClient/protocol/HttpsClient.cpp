#include "ssoClient/protocol/HttpsClient.h"

#include "quillon/PanicVerify.h"
#include "quillon/http/HttpURL.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/protocol/exchangeLog.h"
#include "ssoClient/wire/assertionPlaces.h"

#include <boost/bind/bind.hpp>
#include <boost/smart_ptr/make_shared.hpp>

namespace SsoClient {

namespace {

namespace Http = Quillon::Http;

/** SOAP 1.1 faults come with this status [SOAP11 6.2]. */
constexpr int SoapFaultStatus = 500;

/** What SOAP 1.2 says of faults that are the sender's [SOAP12-2 7.5.1.2]. */
constexpr int SenderFaultStatus = 400;

/** Whether a reply of this status is the service's word, so that its body counts. */
bool IsAcceptable(int status) noexcept
{
    return status / 100 == 2 || status == SoapFaultStatus;
}

bool IsAcceptableInSoap12(int status) noexcept
{
    return IsAcceptable(status) || status == SenderFaultStatus;
}

Http::StatusTest GetStatusTest(SoapVersion soap) noexcept
{
    return soap == SoapVersion::SOAP_1_1 ? &IsAcceptable : &IsAcceptableInSoap12;
}

ExchangeOptions WithTimeout(long long timeout)
{
    ExchangeOptions options;
    options.timeoutMicroseconds = timeout;
    options.connectTimeoutMicroseconds = timeout;
    return options;
}

/** The observer of the caller, and the log where it wants to know; empty if neither does. */
Http::ExchangeObserver MakeObserver(const Http::ExchangeObserver& callers)
{
    if (!LogsExchanges()) {
        return callers;
    }
    return [callers](const Http::ExchangeFacts& facts) {
        LogExchange(facts);
        if (!callers.empty()) {
            callers(facts);
        }
    };
}

void SetSoapHeaders(const Request& request, Http::ClientRequest& httpRequest)
{
    // The action is a quoted string in either version [SOAP11 6.1.1] [RFC 3902].
    const std::string action = "\"" + request.soapAction + "\"";
    if (request.soap == SoapVersion::SOAP_1_1) {
        httpRequest.SetHeader("Content-Type", "text/xml");
        httpRequest.SetHeader("SOAPAction", action);
    } else {
        httpRequest.SetHeader(
            "Content-Type", "application/soap+xml; charset=utf-8; action=" + action);
    }
}

Quillon::Ref<Http::ClientRequest> ComposeRequest(
    const Request& request, const std::string& path, const ExchangeOptions& options)
{
    Quillon::Ref<Http::ClientRequest> httpRequest;
    Http::CreateHttpRequest(Http::HttpMethod::POST, path, httpRequest);
    SetSoapHeaders(request, *httpRequest);
    httpRequest->GetBodyWriter()->Write(request.body.data(), request.body.size());
    httpRequest->SetTimeout(options.timeoutMicroseconds);
    httpRequest->SetConnectTimeout(options.connectTimeoutMicroseconds);
    httpRequest->SetObserver(MakeObserver(options.observer));
    httpRequest->SetBodyStatuses(GetStatusTest(request.soap));
    return httpRequest;
}

} // namespace

HttpsClient::HttpsClient(
    const std::string& url,
    Quillon::Ssl::SSLContext* sslContext,
    const std::string& peer,
    long long timeout)
    : HttpsClient(url, sslContext, peer, WithTimeout(timeout))
{}

HttpsClient::HttpsClient(
    const std::string& url,
    Quillon::Ssl::SSLContext* sslContext,
    const std::string& peer,
    const ExchangeOptions& options)
    : _sslContext(sslContext)
    , _options(options)
{
    bool isHttps = false;
    std::string host;
    int port = 0;
    Http::ParseHttpURL(url, isHttps, host, port, _path);
    if (isHttps && !_sslContext) {
        throw Quillon::InvalidArgumentException(
            "HTTPS connection requested but no SSLContext provided.");
    }
    Quillon::Ref<Http::ConnectionSpec> tcp;
    Http::CreateTCPConnectionSpec(host, port, false, tcp);
    if (isHttps) {
        Http::CreateSSLConnectionSpec(tcp.get(), sslContext, host, peer, _connectionSpec);
    } else {
        _connectionSpec = tcp;
    }
}

boost::shared_ptr<TransportSession> HttpsClient::CreateSession() const
{
    return boost::make_shared<HttpsSession>(_connectionSpec.get(), _path, _options);
}

HttpsSession::HttpsSession(Http::ConnectionSpec* spec, const std::string& path, long long timeout)
    : HttpsSession(spec, path, WithTimeout(timeout))
{}

HttpsSession::HttpsSession(
    Http::ConnectionSpec* spec, const std::string& path, const ExchangeOptions& options)
    : _path(path)
    , _options(options)
{
    Quillon::Ref<Http::CookieStore> cookies;
    Http::CreateCookieStore("", cookies);
    Http::CreateHttpUserAgent(spec, cookies.get(), nullptr, _userAgent);
}

void HttpsSession::SendRequest(const Request& request, Quillon::Ref<Quillon::Reader>& response)
{
    Quillon::Ref<Quillon::System::ScheduledItem> pending;
    SendRequestAsync(request, boost::bind(&noop), pending);
    Quillon::Ref<Http::ClientResponse> httpResponse;
    _userAgent->WaitForResponse(
        static_cast<Http::PendingRequestItem*>(pending.get()),
        _options.timeoutMicroseconds,
        httpResponse);
    boost::shared_ptr<Quillon::Exception> error;
    TranslateResponse(nullptr, httpResponse.get(), error, response, request.soap);
    if (error) {
        error->Throw();
    }
}

void HttpsSession::SendRequestAsync(
    const Request& request,
    const ResponseCallback& callback,
    Quillon::Ref<Quillon::System::ScheduledItem>& pending)
{
    const Http::Completion completion = boost::bind(
        &AsyncTranslateResponse,
        callback,
        boost::placeholders::_1,
        boost::placeholders::_2,
        boost::placeholders::_3,
        request.soap);
    const Quillon::Ref<Http::ClientRequest> httpRequest = ComposeRequest(request, _path, _options);
    Quillon::Ref<Http::PendingRequestItem> item;
    _userAgent->SendRequestAsync(httpRequest.get(), completion, item);
    pending = item;
}

void TranslateResponse(
    Quillon::Exception const* error,
    Http::ClientResponse* response,
    boost::shared_ptr<Quillon::Exception>& outError,
    Quillon::Ref<Quillon::Reader>& outBody,
    SoapVersion soap)
{
    if (error != nullptr) {
        outError = boost::make_shared<CommunicationException>(error->what());
        return;
    }
    if (response == nullptr) {
        Quillon::PanicVerify(
            "response != __null",
            AssertionPlaces::HttpsClient,
            AssertionPlaces::NeitherErrorNorResponse);
    }
    const Http::HttpStatus& status = response->GetStatus();
    if (GetStatusTest(soap)(status.code)) {
        outBody = response->GetBody();
        return;
    }
    outError = boost::make_shared<CommunicationException>(
        "Server returned error: " + std::to_string(status.code) + " " + status.reasonPhrase);
}

void AsyncTranslateResponse(
    const ResponseCallback& callback,
    Quillon::Exception const* error,
    Http::ClientResponse* response,
    Http::PendingRequestItem* /*item*/,
    SoapVersion soap)
{
    boost::shared_ptr<Quillon::Exception> outError;
    Quillon::Ref<Quillon::Reader> outBody;
    TranslateResponse(error, response, outError, outBody, soap);
    callback(outError.get(), outBody.get());
}

} // namespace SsoClient
