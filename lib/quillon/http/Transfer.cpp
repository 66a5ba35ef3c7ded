#include "http/Transfer.h"

#include "http/ClientResponseImpl.h"
#include "http/exchangeReading.h"
#include "system/systemError.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <sys/socket.h>
#include <utility>

namespace Quillon::Http {

namespace {

constexpr char Product[] = "SsoClient/" QUILLON_VERSION;

/** libcurl counts in milliseconds. A shorter limit must not become none. */
long ToMilliseconds(long long microseconds)
{
    return static_cast<long>(std::min<long long>((microseconds - 1) / 1000 + 1, INT_MAX));
}

void Append(StringListOwner& list, const std::string& text)
{
    curl_slist* const longer = curl_slist_append(list.get(), text.c_str());
    if (longer == nullptr) {
        throw std::bad_alloc();
    }
    static_cast<void>(list.release()); // the first call makes the list, the others keep its head
    list.reset(longer);
}

} // namespace

Transfer::Transfer(
    Ref<ClientRequestImpl> request,
    Ref<ConnectionPoolImpl> pool,
    Ref<CookieStoreImpl> cookies,
    const Ref<PendingRequestItemImpl>& item)
    : _request(std::move(request))
    , _pool(std::move(pool))
    , _spec(_pool->GetSpec())
    , _cookies(std::move(cookies))
    , _notice(1, item)
    , _exchange(_notice.front()->GetExchange())
    , _reply(_request->GetBodyStatuses(), !_request->GetObserver().empty())
    , _record(new Ssl::PeerRecord)
    , _easy(curl_easy_init())
{
    if (_easy == nullptr) {
        throw std::bad_alloc();
    }
    _record->isObserved = !_request->GetObserver().empty();
    SetLimits();
    SetTarget();
    SetRequest();
    if (_spec.tls != nullptr) {
        SetTls();
    }
    SetCallbacks();
}

Transfer::~Transfer()
{
    _easy.reset(); // before its connections count as idle
    if (_usesPool) {
        _pool->Leave();
    }
}

template <class T>
void Transfer::Set(CURLoption option, T value)
{
    // In parentheses, to get at the function behind libcurl's checking macro.
    const CURLcode result = (curl_easy_setopt)(_easy.get(), option, value);
    if (result != CURLE_OK) {
        throw HttpException(
            "libcurl refuses the option " + std::to_string(option) + ": "
            + curl_easy_strerror(result) + ".");
    }
}

void Transfer::SetLimits()
{
    Set(CURLOPT_TIMEOUT_MS, ToMilliseconds(_request->GetTimeout()));
    Set(CURLOPT_CONNECTTIMEOUT_MS, ToMilliseconds(_request->GetConnectTimeout()));
    Set(CURLOPT_NOSIGNAL, 1L);
    // A transfer that ends early does not wait for its name look-up, and with it all the others.
    Set(CURLOPT_QUICK_EXIT, 1L);
}

void Transfer::SetTarget()
{
    const char* const scheme = _spec.tls != nullptr ? "https://" : "http://";
    const std::string server = ToUrlHost(_spec.host) + ":" + std::to_string(_spec.port);
    Set(CURLOPT_URL, (scheme + server + _request->GetPath()).c_str());
    Set(CURLOPT_PATH_AS_IS, 1L);
    Set(CURLOPT_PROTOCOLS_STR, "http,https");
    Set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
    Set(CURLOPT_HTTP09_ALLOWED, 0L);
    Set(CURLOPT_FOLLOWLOCATION, 0L);
    // An empty name means none, whatever the environment says.
    Set(CURLOPT_PROXY, "");
    Set(CURLOPT_NETRC, static_cast<long>(CURL_NETRC_IGNORED));
    Set(CURLOPT_TCP_NODELAY, 1L);
    Set(CURLOPT_TCP_KEEPALIVE, _spec.keepAlive ? 1L : 0L);
    if (_spec.connectHost != _spec.host) {
        Append(_connectTo, "::" + ToUrlHost(_spec.connectHost) + ":");
        Set(CURLOPT_CONNECT_TO, _connectTo.get());
    }
}

void Transfer::SetRequest()
{
    const std::string& body = _request->GetBody();
    Set(CURLOPT_POST, 1L);
    // Not copied: the request outlives the transfer.
    Set(CURLOPT_POSTFIELDS, body.data());
    Set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
    Set(CURLOPT_USERAGENT, Product);
    for (const auto& [name, value] : _request->GetHeaders()) {
        // libcurl takes a name with a colon and nothing else as an order to leave it out.
        std::string line = name + (value.empty() ? ";" : ": ");
        line += value;
        Append(_headers, line);
    }
    // Waiting for a go-ahead costs a second with servers that do not give one.
    Append(_headers, "Expect:");
    Set(CURLOPT_HTTPHEADER, _headers.get());
    if (_cookies != nullptr) {
        Set(CURLOPT_COOKIEFILE, ""); // no file: only turns the cookie engine on
    }
}

void Transfer::SetTls()
{
    Set(CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
    Set(CURLOPT_SSL_VERIFYPEER, 1L);
    // The peer's name is verified in the handshake, see TlsPeer. Where it is the one in the URL,
    // libcurl verifies it as well.
    Set(CURLOPT_SSL_VERIFYHOST, _spec.tls->GetName() == _spec.host ? 2L : 0L);
    // Authorities and sessions are TlsPeer's.
    Set(CURLOPT_CAINFO, static_cast<char*>(nullptr));
    Set(CURLOPT_CAPATH, static_cast<char*>(nullptr));
    Set(CURLOPT_CA_CACHE_TIMEOUT, 0L);
    Set(CURLOPT_SSL_SESSIONID_CACHE, 0L);
    Set(CURLOPT_SSL_CTX_FUNCTION, &Transfer::OnSslContext);
    Set(CURLOPT_SSL_CTX_DATA, this);
    if (!_spec.pin.empty()) {
        Set(CURLOPT_PINNEDPUBLICKEY, _spec.pin.c_str());
    }
}

void Transfer::SetCallbacks()
{
    Set(CURLOPT_ERRORBUFFER, _errorText.data());
    Set(CURLOPT_HEADERFUNCTION, &Transfer::OnHeader);
    Set(CURLOPT_HEADERDATA, this);
    Set(CURLOPT_WRITEFUNCTION, &Transfer::OnBody);
    Set(CURLOPT_WRITEDATA, this);
    Set(CURLOPT_OPENSOCKETFUNCTION, &Transfer::OnSocket);
    Set(CURLOPT_OPENSOCKETDATA, this);
    Set(CURLOPT_PREREQFUNCTION, &Transfer::OnRequest);
    Set(CURLOPT_PREREQDATA, this);
    Set(CURLOPT_DEBUGFUNCTION, &Transfer::OnTrace);
    Set(CURLOPT_DEBUGDATA, this);
    Set(CURLOPT_XFERINFOFUNCTION, &Transfer::OnProgress);
    Set(CURLOPT_XFERINFODATA, this);
    Set(CURLOPT_NOPROGRESS, 0L);
}

void Transfer::Prepare()
{
    CURLSH* const connections = _pool->Use();
    _usesPool = true;
    Set(CURLOPT_SHARE, connections);
    Set(CURLOPT_CLOSESOCKETFUNCTION, &OpenSockets::Close);
    Set(CURLOPT_CLOSESOCKETDATA, &_pool->GetSockets());
    if (_cookies != nullptr) {
        _givenCookies = _cookies->GetLines();
        for (const std::string& line : _givenCookies) {
            Set(CURLOPT_COOKIELIST, line.c_str());
        }
    }
}

std::size_t Transfer::OnHeader(char* data, std::size_t size, std::size_t count, void* self)
{
    try {
        const std::string_view line(data, size * count);
        return static_cast<Transfer*>(self)->Take(line) ? line.size() : 0;
    } catch (const std::exception&) {
        return 0;
    }
}

bool Transfer::Take(std::string_view headerLine)
{
    if (!_reply.AddHeaderLine(headerLine)) {
        return false;
    }
    if (_reply.HasHead()) {
        Set(CURLOPT_VERBOSE, 1L); // from now on `OnTrace` sees the body with its framing
    }
    return true;
}

std::size_t Transfer::OnBody(char* data, std::size_t size, std::size_t count, void* self)
{
    try {
        const std::string_view piece(data, size * count);
        return static_cast<Transfer*>(self)->_reply.AddBody(piece) ? piece.size() : 0;
    } catch (const std::bad_alloc&) {
        return 0;
    }
}

int Transfer::OnTrace(
    CURL* /*easy*/, curl_infotype type, char* /*data*/, std::size_t size, void* self)
{
    if (type == CURLINFO_DATA_IN) {
        try {
            static_cast<Transfer*>(self)->_reply.AddWireBytes(size);
        } catch (const std::bad_alloc&) { // NOLINT(bugprone-empty-catch): the next octets tell
        }
    }
    return 0;
}

/** Ends a transfer whose reply was refused where no other callback comes. */
int Transfer::OnProgress(void* self, curl_off_t, curl_off_t, curl_off_t, curl_off_t)
{
    return static_cast<Transfer*>(self)->_reply.GetProblem().empty() ? 0 : 1;
}

/**
 * libcurl sends a request again, over another connection, when a connection that was kept ends
 * before the reply begins. The server may have acted on the request by then, so that it goes out
 * once. A kept connection that is of no use is noticed before: it is closed, and another one taken.
 */
int Transfer::OnRequest(void* self, char* /*ip*/, char* /*localIp*/, int /*port*/, int localPort)
{
    Transfer& transfer = *static_cast<Transfer*>(self);
    transfer._hasStaleConnection = transfer.HasUnaskedInput(localPort);
    if (transfer._hasStaleConnection) {
        return CURL_PREREQFUNC_ABORT;
    }
    transfer.FindRecord();
    transfer._earlierError = transfer.GetSystemError();
    transfer._isRepeated = std::exchange(transfer._isSent, true);
    return transfer._isRepeated ? CURL_PREREQFUNC_ABORT : CURL_PREREQFUNC_OK;
}

/**
 * Whether a connection that was kept has something to read before anything was asked: its end, or
 * octets that would be taken for the reply. With TLS it may be a message of TLS itself, for which a
 * new connection is no high price.
 */
bool Transfer::HasUnaskedInput(int localPort) const
{
    long opened = 0;
    curl_easy_getinfo(_easy.get(), CURLINFO_NUM_CONNECTS, &opened);
    return opened == 0 && _pool->GetSockets().HasInput(localPort);
}

bool Transfer::IsToBeStartedAgain() noexcept
{
    const bool isToBe = std::exchange(_hasStaleConnection, false);
    if (isToBe) {
        _errorText[0] = '\0'; // says that the callback refused to go on
    }
    return isToBe;
}

/** A connection that was kept has the one of the transfer that opened it. */
void Transfer::FindRecord()
{
    curl_tlssessioninfo* info = nullptr;
    curl_easy_getinfo(_easy.get(), CURLINFO_TLS_SSL_PTR, &info);
    if (_spec.tls != nullptr && info != nullptr && info->internals != nullptr) {
        _record = Ssl::GetRecord(static_cast<const SSL*>(info->internals));
    }
}

curl_socket_t Transfer::OnSocket(void* self, curlsocktype /*purpose*/, curl_sockaddr* address)
{
    Transfer& transfer = *static_cast<Transfer*>(self);
    transfer._isRepeated = transfer._isSent;
    if (transfer._isRepeated) {
        return CURL_SOCKET_BAD;
    }
    const curl_socket_t opened = transfer._pool->GetSockets().Open(*address);
    transfer._socketError = opened == CURL_SOCKET_BAD ? errno : 0;
    return opened;
}

CURLcode Transfer::OnSslContext(CURL* /*easy*/, void* context, void* self)
{
    const Transfer& transfer = *static_cast<Transfer*>(self);
    return transfer._spec.tls->Prepare(static_cast<SSL_CTX*>(context), transfer._record)
               ? CURLE_OK
               : CURLE_SSL_CERTPROBLEM;
}

Outcome Transfer::Finish(CURLcode result)
{
    if (_cookies != nullptr) {
        _cookies->Merge(_givenCookies, ReadCookies());
    }
    Outcome outcome = Judge(result);
    if (!_request->GetObserver().empty()) {
        Tell(outcome);
    }
    return outcome;
}

void Transfer::Tell(const Outcome& outcome) const
{
    try {
        _request->GetObserver()(CollectFacts(outcome));
    } catch (...) { // NOLINT(bugprone-empty-catch): who only looks on changes nothing
    }
}

ExchangeFacts Transfer::CollectFacts(const Outcome& outcome) const
{
    ExchangeFacts facts = ReadFacts(_easy.get());
    facts.server = _exchange.GetServer();
    facts.path = _request->GetPath();
    facts.tlsVersion = _record->version;
    facts.tlsCipher = _record->cipher;
    facts.certificates = _record->certificates;
    facts.status = _reply.GetStatus().code;
    facts.location = _reply.GetLocation();
    facts.date = ParseHttpDate(_reply.GetDate());
    facts.retryAfterSeconds = ParseRetryAfter(_reply.GetRetryAfter(), facts.date);
    facts.isSent = _isSent;
    facts.isSessionResumed = _record->isResumed;
    facts.failure = outcome.error != nullptr ? outcome.error->what() : "";
    return facts;
}

Outcome Transfer::Judge(CURLcode result)
{
    if (IsAnswered(result)) {
        return {nullptr, MakeClientResponse(_reply.GetStatus(), _reply.TakeBody())};
    }
    if (result == CURLE_OPERATION_TIMEDOUT) {
        return {std::make_shared<TimeoutException>(DescribeTimeout()), {}};
    }
    return {std::make_shared<HttpException>(Describe(result)), {}};
}

TimeoutException Transfer::DescribeTimeout() const
{
    const long long connectTimeout = _request->GetConnectTimeout();
    return !_isSent && connectTimeout < _request->GetTimeout()
               ? MakeConnectTimeoutException(_exchange.GetServer(), connectTimeout)
               : MakeTimeoutException(_exchange.GetServer(), _request->GetTimeout());
}

bool Transfer::IsAnswered(CURLcode result) const noexcept
{
    if (_reply.IsAnswered()) {
        return true; // the transfer was ended there
    }
    if (_reply.HasInterimStatus()) {
        // Nothing follows, or something that is no reply.
        return result == CURLE_GOT_NOTHING || result == CURLE_UNSUPPORTED_PROTOCOL;
    }
    // libcurl takes the end of the connection for the end of a head.
    return result == CURLE_OK && _reply.HasHead() && !IsCutOff();
}

/**
 * Whether the reply ends with the connection and TLS has not said that this is the end, so that
 * whoever cuts the connection could choose it [RFC 9112 9.8].
 */
bool Transfer::IsCutOff() const noexcept
{
    return _spec.tls != nullptr && _reply.EndsWithConnection() && !_record->isClosed;
}

CookieLines Transfer::ReadCookies() const
{
    curl_slist* list = nullptr;
    curl_easy_getinfo(_easy.get(), CURLINFO_COOKIELIST, &list);
    const StringListOwner owner(list);
    CookieLines lines;
    for (; list != nullptr; list = list->next) {
        lines.insert(list->data);
    }
    return lines;
}

std::string Transfer::DescribeTlsRefusal() const
{
    long verdict = 0;
    curl_easy_getinfo(_easy.get(), CURLINFO_SSL_VERIFYRESULT, &verdict);
    return "The TLS certificate of " + _exchange.GetServer() + " is refused: "
           + (verdict != 0 ? Ssl::DescribeVerifyResult(verdict) : _errorText.data())
           + ". It must name \"" + _spec.tls->GetName() + "\" and lead to a trusted authority.";
}

std::string Transfer::DescribeAlert(CURLcode result) const
{
    const std::string& server = _exchange.GetServer();
    const std::string words = Ssl::DescribeAlert(_record->alert) + ".";
    if (!Ssl::IsAboutCertificate(_record->alert)) {
        return result == CURLE_SSL_CONNECT_ERROR
                   ? "The TLS handshake with " + server + " failed: the server refuses it: " + words
                   : "The server " + server + " ended the TLS connection: " + words;
    }
    return "The server " + server
           + (_spec.tls->HasIdentity() ? " refuses the client's TLS certificate: "
                                       : " refuses a client without a TLS certificate: ")
           + words;
}

std::string Transfer::DescribeFailedHandshake() const
{
    const std::string detail = GetDetail(CURLE_SSL_CONNECT_ERROR);
    // libcurl has no words for an end, nor OpenSSL for an alert that says no more than that.
    const bool isEnd = _record->isClosed || detail.find("SSL_ERROR_SYSCALL") != std::string::npos;
    return "The TLS handshake with " + _exchange.GetServer()
           + " failed: " + (isEnd ? "the server ended the connection" : detail) + ".";
}

int Transfer::GetSystemError() const
{
    long error = 0;
    curl_easy_getinfo(_easy.get(), CURLINFO_OS_ERRNO, &error);
    return error != 0 ? static_cast<int>(error) : _socketError;
}

std::string Transfer::DescribeRefusedConnection() const
{
    const int error = GetSystemError();
    return "Cannot connect to " + _spec.connectHost + " port " + std::to_string(_spec.port) + ": "
           + (error != 0 ? System::DescribeSystemError(error) : _errorText.data()) + ".";
}

std::string Transfer::DescribeBrokenConnection() const
{
    const int error = GetSystemError();
    const bool isOfThisConnection = error != 0 && error != _earlierError;
    return "The exchange with " + _exchange.GetServer() + " failed: "
           + (isOfThisConnection ? System::DescribeSystemError(error) : GetDetail(CURLE_RECV_ERROR))
           + ".";
}

/** libcurl's words for a failure, without the codes of OpenSSL that may stand before them. */
std::string Transfer::GetDetail(CURLcode result) const
{
    std::string detail = _errorText[0] != '\0' ? _errorText.data() : curl_easy_strerror(result);
    if (detail.find("error:") != std::string::npos) {
        detail.erase(0, detail.rfind(':') + 1);
    }
    return detail;
}

std::string Transfer::Describe(CURLcode result) const
{
    const std::string& server = _exchange.GetServer();
    if (!_reply.GetProblem().empty()) {
        return "The reply of " + server + " " + _reply.GetProblem() + ".";
    }
    if (_record->alert != 0) {
        return DescribeAlert(result);
    }
    if (_isRepeated) {
        result = CURLE_GOT_NOTHING;
    }
    if (result == CURLE_OUT_OF_MEMORY && _isSent && !_reply.HasHead()) {
        // libcurl's words for a line that is longer than its own limit, which is above ours.
        return "The reply of " + server + " " + ReplyCollector::DescribeTooManyHeaders() + ".";
    }
    if (_reply.HasHead() && GetDetail(result) == "Out of memory in chunked-encoding") {
        return "The reply of " + server + " has a trailer that is too long."; // for libcurl
    }
    switch (result) {
    case CURLE_OK:
        return "The reply of " + server
               + (_reply.HasHead() ? " ended too early: the TLS connection ended without notice."
                                   : " ended too early: its headers are not complete.");
    case CURLE_COULDNT_RESOLVE_HOST:
        return "The host name " + _spec.connectHost + " cannot be resolved.";
    case CURLE_COULDNT_CONNECT:
        return DescribeRefusedConnection();
    case CURLE_PEER_FAILED_VERIFICATION:
        return DescribeTlsRefusal();
    case CURLE_SSL_PINNEDPUBKEYNOTMATCH:
        return "The TLS key of " + server + " is not the pinned one, " + _spec.pin + ".";
    case CURLE_SSL_CONNECT_ERROR:
        return DescribeFailedHandshake();
    case CURLE_GOT_NOTHING:
        return "The server " + server + " closed the connection without a reply.";
    case CURLE_PARTIAL_FILE:
        return "The reply of " + server + " ended too early: " + GetDetail(result) + ".";
    case CURLE_SEND_ERROR:
    case CURLE_RECV_ERROR:
        return DescribeBrokenConnection();
    case CURLE_UNSUPPORTED_PROTOCOL:
    case CURLE_WEIRD_SERVER_REPLY:
        return "The reply of " + server + " is not HTTP: " + GetDetail(result) + ".";
    default:
        return "The exchange with " + server + " failed: " + GetDetail(result) + ".";
    }
}

} // namespace Quillon::Http
