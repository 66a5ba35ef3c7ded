#pragma once

#include "ssoClient/protocol/ConnectionShelf.h"
#include "ssoClient/protocol/Transport.h"

#include "quillon/http/ConnectionSpec.h"
#include "quillon/http/UserAgent.h"
#include "quillon/ssl/SSLContext.h"
#include "ssoClient/ExchangeOptions.h"

#include <string>

namespace SsoClient {

/** Posts SOAP messages to the URL of a token service. */
class HttpsClient final : public Transport
{
public:
    /**
     * @param url         of the service, `https` or `http`.
     * @param sslContext  may be null only for `http`; kept by reference.
     * @param peer        what the TLS peer must prove, see
     *                    `Quillon::Http::CreateSSLConnectionSpec`.
     * @param timeout     of each exchange, in microseconds.
     *
     * @throws Quillon::InvalidArgumentException  a malformed URL or peer, or no SSL context.
     */
    HttpsClient(
        const std::string& url,
        Quillon::Ssl::SSLContext* sslContext,
        const std::string& peer,
        long long timeout);

    /** The same with all that can be said of the exchanges. */
    HttpsClient(
        const std::string& url,
        Quillon::Ssl::SSLContext* sslContext,
        const std::string& peer,
        const ExchangeOptions& options);

    boost::shared_ptr<TransportSession> CreateSession() const override;
    void RequireUsable() const override;
    boost::shared_ptr<TransportSession> CreateControlledSession(
        const SessionOptions& options) const override;
    boost::shared_ptr<const Transport> WithReuse(
        const boost::optional<ConnectionReuse>& reuse) const override;

private:
    Quillon::Ref<Quillon::Http::ConnectionSpec> _connectionSpec;
    Quillon::Ref<Quillon::Ssl::SSLContext> _sslContext;
    std::string _path;
    ExchangeOptions _options;
    boost::shared_ptr<ConnectionShelf> _shelf; // null: each session has a connection of its own
};

/** A conversation with cookies and connections of its own. */
class HttpsSession final : public TransportSession
{
public:
    HttpsSession(Quillon::Http::ConnectionSpec* spec, const std::string& path, long long timeout);
    HttpsSession(
        Quillon::Http::ConnectionSpec* spec,
        const std::string& path,
        const ExchangeOptions& options);

    /** @param shelf  where the connection comes from and goes to; null for one of its own. */
    HttpsSession(
        Quillon::Http::ConnectionSpec* spec,
        const std::string& path,
        const ExchangeOptions& options,
        const boost::shared_ptr<ConnectionShelf>& shelf,
        const SessionOptions& sessionOptions);

    HttpsSession(const HttpsSession&) = delete;
    HttpsSession& operator=(const HttpsSession&) = delete;
    ~HttpsSession();

    void SendRequest(const Request& request, Quillon::Ref<Quillon::Reader>& response) override;
    void SendRequestAsync(
        const Request& request,
        const ResponseCallback& callback,
        Quillon::Ref<Quillon::System::ScheduledItem>& pending) override;

private:
    ExchangeOptions LimitOptions() const;
    void Start(
        const Request& request,
        const ExchangeOptions& options,
        const ResponseCallback& callback,
        Quillon::Ref<Quillon::System::ScheduledItem>& pending);

    Quillon::Ref<Quillon::Http::UserAgent> _userAgent;
    std::string _path;
    ExchangeOptions _options;
    SessionOptions _sessionOptions;
    boost::shared_ptr<ConnectionShelf> _shelf;
    Quillon::Ref<Quillon::Http::HttpConnectionPool> _connection; // null without a shelf
};

/**
 * Decides what an answered or failed exchange means: a reply with status 2xx or 500 is the
 * service's word (SOAP 1.1 sends faults with 500), everything else an error. SOAP 1.2 sends faults
 * with 400, too.
 *
 * @param error     why the exchange failed, or null.
 * @param response  the reply; never null if `error` is.
 * @param outError  receives a `CommunicationException`, or stays as it is.
 * @param outBody   receives the body of an acceptable reply, or stays as it is.
 */
void TranslateResponse(
    Quillon::Exception const* error,
    Quillon::Http::ClientResponse* response,
    boost::shared_ptr<Quillon::Exception>& outError,
    Quillon::Ref<Quillon::Reader>& outBody,
    SoapVersion soap = SoapVersion::SOAP_1_1);

/** Hands what `TranslateResponse` makes of a completed exchange to `callback`. */
void AsyncTranslateResponse(
    const ResponseCallback& callback,
    Quillon::Exception const* error,
    Quillon::Http::ClientResponse* response,
    Quillon::Http::PendingRequestItem* item,
    SoapVersion soap = SoapVersion::SOAP_1_1);

} // namespace SsoClient
