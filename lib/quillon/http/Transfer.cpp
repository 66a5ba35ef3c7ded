#include "http/Transfer.h"

#include "http/ClientResponseImpl.h"

#include <algorithm>
#include <climits>
#include <sys/socket.h>
#include <system_error>
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

/** Programs that the host starts do not inherit the connection. */
curl_socket_t OpenSocket(void* /*data*/, curlsocktype /*purpose*/, curl_sockaddr* address)
{
    return socket(address->family, address->socktype | SOCK_CLOEXEC, address->protocol);
}

} // namespace

Transfer::Transfer(
    Ref<ClientRequestImpl> request,
    Ref<ConnectionPoolImpl> pool,
    Ref<CookieStoreImpl> cookies,
    Ref<Exchange> exchange)
    : _request(std::move(request))
    , _pool(std::move(pool))
    , _spec(_pool->GetSpec())
    , _cookies(std::move(cookies))
    , _exchange(std::move(exchange))
    , _easy(curl_easy_init())
{
    if (_easy == nullptr) {
        throw std::bad_alloc();
    }
    SetLimits();
    SetTarget();
    SetRequest();
    if (_spec.tls != nullptr) {
        SetTls();
    }
    SetCallbacks();
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
    const long timeout = ToMilliseconds(_request->GetTimeout());
    Set(CURLOPT_TIMEOUT_MS, timeout);
    Set(CURLOPT_CONNECTTIMEOUT_MS, timeout);
    Set(CURLOPT_MAXFILESIZE_LARGE, static_cast<curl_off_t>(ReplyLimits::MaxBodyBytes));
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
    Set(CURLOPT_NOPROXY, "*");
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
    const WipedBytes& body = _request->GetBody();
    Set(CURLOPT_POST, 1L);
    // Not copied: the request outlives the transfer.
    Set(CURLOPT_POSTFIELDS, body.empty() ? "" : body.data());
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
    Set(CURLOPT_SSL_CTX_DATA, _spec.tls.get());
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
    Set(CURLOPT_OPENSOCKETFUNCTION, &OpenSocket);
}

void Transfer::Prepare()
{
    Set(CURLOPT_SHARE, _pool->GetShare());
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
        return static_cast<Transfer*>(self)->_reply.AddHeaderLine(line) ? line.size() : 0;
    } catch (const std::bad_alloc&) {
        return 0;
    }
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

CURLcode Transfer::OnSslContext(CURL* /*easy*/, void* context, void* self)
{
    return static_cast<Ssl::TlsPeer*>(self)->Prepare(static_cast<SSL_CTX*>(context))
               ? CURLE_OK
               : CURLE_SSL_CERTPROBLEM;
}

Outcome Transfer::Finish(CURLcode result)
{
    if (_cookies != nullptr) {
        _cookies->Merge(_givenCookies, ReadCookies());
    }
    if (result == CURLE_GOT_NOTHING && _reply.HasInterimStatus()) {
        result = CURLE_OK;
    }
    if (result == CURLE_OK) {
        return {nullptr, MakeClientResponse(_reply.GetStatus(), _reply.TakeBody())};
    }
    if (result == CURLE_OPERATION_TIMEDOUT) {
        return {
            std::make_shared<TimeoutException>(
                MakeTimeoutException(_exchange->GetServer(), _request->GetTimeout())),
            {}};
    }
    return {std::make_shared<HttpException>(Describe(result)), {}};
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
    return "The TLS certificate of " + _exchange->GetServer() + " is refused: "
           + (verdict != 0 ? Ssl::DescribeVerifyResult(verdict) : _errorText.data())
           + ". It must name \"" + _spec.tls->GetName() + "\" and lead to a trusted authority.";
}

std::string Transfer::DescribeRefusedConnection() const
{
    long error = 0;
    curl_easy_getinfo(_easy.get(), CURLINFO_OS_ERRNO, &error);
    return "Cannot connect to " + _spec.connectHost + " port " + std::to_string(_spec.port) + ": "
           + (error != 0 ? std::generic_category().message(static_cast<int>(error))
                         : _errorText.data())
           + ".";
}

std::string Transfer::Describe(CURLcode result) const
{
    const std::string& server = _exchange->GetServer();
    if (!_reply.GetProblem().empty()) {
        return "The reply of " + server + " " + _reply.GetProblem() + ".";
    }
    const std::string detail =
        _errorText[0] != '\0' ? _errorText.data() : curl_easy_strerror(result);
    switch (result) {
    case CURLE_COULDNT_RESOLVE_HOST:
        return "The host name " + _spec.connectHost + " cannot be resolved.";
    case CURLE_COULDNT_CONNECT:
        return DescribeRefusedConnection();
    case CURLE_PEER_FAILED_VERIFICATION:
        return DescribeTlsRefusal();
    case CURLE_SSL_PINNEDPUBKEYNOTMATCH:
        return "The TLS key of " + server + " is not the pinned one, " + _spec.pin + ".";
    case CURLE_SSL_CONNECT_ERROR:
        return "The TLS handshake with " + server + " failed: " + detail + ".";
    case CURLE_FILESIZE_EXCEEDED:
        return "The reply of " + server + " is larger than "
               + std::to_string(ReplyLimits::MaxBodyBytes) + " bytes.";
    case CURLE_GOT_NOTHING:
        return "The server " + server + " closed the connection without a reply.";
    case CURLE_PARTIAL_FILE:
        return "The reply of " + server + " ended too early: " + detail + ".";
    case CURLE_UNSUPPORTED_PROTOCOL:
    case CURLE_WEIRD_SERVER_REPLY:
        return "The reply of " + server + " is not HTTP: " + detail + ".";
    default:
        return "The exchange with " + server + " failed: " + detail + ".";
    }
}

} // namespace Quillon::Http
