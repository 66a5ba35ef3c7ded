#pragma once

#include "http/CallbackThread.h"
#include "http/ClientRequestImpl.h"
#include "http/ConnectionPoolImpl.h"
#include "http/CookieStoreImpl.h"
#include "http/Curl.h"
#include "http/Exchange.h"
#include "http/ReplyCollector.h"

#include <array>

namespace Quillon::Http {

/**
 * One exchange as libcurl sees it. Made on the caller's thread, then only used and destroyed by
 * the engine.
 */
class Transfer
{
public:
    /** @param cookies  may be null. @throws HttpException  libcurl does not take an option. */
    Transfer(
        Ref<ClientRequestImpl> request,
        Ref<ConnectionPoolImpl> pool,
        Ref<CookieStoreImpl> cookies,
        const Ref<PendingRequestItemImpl>& item);

    ~Transfer();
    Transfer(const Transfer&) = delete;
    Transfer& operator=(const Transfer&) = delete;

    /** Attaches what is shared with other transfers. On the I/O thread. */
    void Prepare();

    /** Judges the result of the transfer, and tells the observer of the request. On the I/O thread.
     */
    Outcome Finish(CURLcode result);

    /**
     * Makes it ready to be started again if it has ended before it sent anything, because the
     * connection that was kept for it is of no use any more. @return whether it is. On the I/O
     * thread.
     */
    bool IsToBeStartedAgain() noexcept;

    CURL* GetHandle() const noexcept { return _easy.get(); }
    Exchange& GetExchange() const noexcept { return _exchange; }

    /** What the callback thread is given when the exchange has ended. Called once. */
    Notice TakeNotice() noexcept { return std::move(_notice); }

private:
    static std::size_t OnHeader(char* data, std::size_t size, std::size_t count, void* self);
    static std::size_t OnBody(char* data, std::size_t size, std::size_t count, void* self);
    static int OnTrace(CURL* easy, curl_infotype type, char* data, std::size_t size, void* self);
    static int OnProgress(void* self, curl_off_t, curl_off_t, curl_off_t, curl_off_t);
    static int OnRequest(void* self, char*, char*, int, int);
    static curl_socket_t OnSocket(void* self, curlsocktype purpose, curl_sockaddr* address);
    static CURLcode OnSslContext(CURL* easy, void* context, void* self);

    template <class T>
    void Set(CURLoption option, T value);

    void SetLimits();
    void SetTarget();
    void SetRequest();
    void SetTls();
    void SetCallbacks();

    bool Take(std::string_view headerLine);
    bool HasUnaskedInput(int localPort) const;
    void FindRecord();
    bool IsAnswered(CURLcode result) const noexcept;
    bool IsCutOff() const noexcept;
    Outcome Judge(CURLcode result);
    void Tell(const Outcome& outcome) const;
    ExchangeFacts CollectFacts(const Outcome& outcome) const;
    TimeoutException DescribeTimeout() const;
    CookieLines ReadCookies() const;
    std::string Describe(CURLcode result) const;
    std::string DescribeTlsRefusal() const;
    std::string DescribeRefusedConnection() const;
    std::string DescribeBrokenConnection() const;
    std::string DescribeAlert(CURLcode result) const;
    std::string DescribeFailedHandshake() const;
    std::string GetDetail(CURLcode result) const;
    int GetSystemError() const;

    const Ref<ClientRequestImpl> _request;
    const Ref<ConnectionPoolImpl> _pool;
    const ConnectionSpecImpl& _spec; // kept by the pool
    const Ref<CookieStoreImpl> _cookies;
    Notice _notice;
    Exchange& _exchange; // kept by the notice, or by who has taken that

    CookieLines _givenCookies;
    ReplyCollector _reply;
    Ref<Ssl::PeerRecord> _record;     // of the connection
    bool _hasStaleConnection = false; // see `IsToBeStartedAgain`
    bool _isSent = false;             // libcurl has begun to send the request
    bool _usesPool = false;
    bool _isRepeated = false; // libcurl has tried to send it again
    int _socketError = 0;
    int _earlierError = 0; // of an address that was tried before the one that answered
    std::array<char, CURL_ERROR_SIZE> _errorText{};
    StringListOwner _headers;
    StringListOwner _connectTo;
    EasyOwner _easy; // last, because it refers to what stands above
};

} // namespace Quillon::Http
