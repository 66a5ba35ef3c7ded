#include "ssoClient/protocol/HttpsClient.h"

#include "quillon/PanicVerify.h"
#include "quillon/http/HttpURL.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/protocol/exchangeLog.h"
#include "ssoClient/wire/assertionPlaces.h"

#include <boost/bind/bind.hpp>
#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>

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

/** Tells both; empty if both are. */
Http::ExchangeObserver Both(const Http::ExchangeObserver& one, const Http::ExchangeObserver& other)
{
    if (one.empty() || other.empty()) {
        return one.empty() ? other : one;
    }
    return [one, other](const Http::ExchangeFacts& facts) {
        one(facts);
        other(facts);
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

void HttpsClient::RequireUsable() const
{
    Quillon::Ref<Http::HttpConnectionPool> pool;
    Http::CreateHttpConnectionPool(_connectionSpec.get(), pool); // which is what refuses it
}

boost::shared_ptr<TransportSession> HttpsClient::CreateSession() const
{
    return CreateControlledSession(SessionOptions());
}

boost::shared_ptr<TransportSession> HttpsClient::CreateControlledSession(
    const SessionOptions& options) const
{
    return boost::make_shared<HttpsSession>(
        _connectionSpec.get(), _path, _options, _shelf, options);
}

boost::shared_ptr<const Transport> HttpsClient::WithReuse(
    const boost::optional<ConnectionReuse>& reuse) const
{
    const auto copy = boost::make_shared<HttpsClient>(*this);
    copy->_shelf.reset();
    if (reuse) {
        copy->_shelf = boost::make_shared<ConnectionShelf>(_connectionSpec, *reuse);
    }
    return copy;
}

HttpsSession::HttpsSession(Http::ConnectionSpec* spec, const std::string& path, long long timeout)
    : HttpsSession(spec, path, WithTimeout(timeout))
{}

HttpsSession::HttpsSession(
    Http::ConnectionSpec* spec, const std::string& path, const ExchangeOptions& options)
    : HttpsSession(spec, path, options, nullptr, SessionOptions())
{}

HttpsSession::HttpsSession(
    Http::ConnectionSpec* spec,
    const std::string& path,
    const ExchangeOptions& options,
    const boost::shared_ptr<ConnectionShelf>& shelf,
    const SessionOptions& sessionOptions)
    : _path(path)
    , _options(options)
    , _sessionOptions(sessionOptions)
    , _shelf(shelf)
{
    if (_shelf) {
        _connection = _shelf->Take();
    }
    Quillon::Ref<Http::CookieStore> cookies;
    Http::CreateCookieStore("", cookies);
    Http::CreateHttpUserAgent(spec, cookies.get(), _connection.get(), _userAgent);
}

HttpsSession::~HttpsSession()
{
    if (_shelf && !_sessionOptions.isNegotiation) {
        _shelf->PutBack(_connection);
    }
}

/** The options of this session's transport, with what the call says of the next exchange. */
ExchangeOptions HttpsSession::LimitOptions() const
{
    ExchangeOptions options = _options;
    if (!_sessionOptions.timeLeft.empty()) {
        options.timeoutMicroseconds =
            std::min(options.timeoutMicroseconds, _sessionOptions.timeLeft());
    }
    options.observer = Both(_sessionOptions.observer, _options.observer);
    return options;
}

void HttpsSession::SendRequest(const Request& request, Quillon::Ref<Quillon::Reader>& response)
{
    const ExchangeOptions options = LimitOptions();
    Quillon::Ref<Quillon::System::ScheduledItem> pending;
    Start(request, options, boost::bind(&noop), pending);
    if (!_sessionOptions.onPending.empty()) {
        _sessionOptions.onPending(pending);
    }
    Quillon::Ref<Http::ClientResponse> httpResponse;
    _userAgent->WaitForResponse(
        static_cast<Http::PendingRequestItem*>(pending.get()),
        options.timeoutMicroseconds,
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
    Start(request, LimitOptions(), callback, pending);
}

void HttpsSession::Start(
    const Request& request,
    const ExchangeOptions& options,
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
    const Quillon::Ref<Http::ClientRequest> httpRequest = ComposeRequest(request, _path, options);
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
