#include "quillon/http/HttpURL.h"

#include "http/hostSyntax.h"

#include "quillon/StringUtil.h"

#include <charconv>

namespace Quillon::Http {

namespace {

constexpr int HttpPort = 80;
constexpr int HttpsPort = 443;

struct UrlParts
{
    bool isHttps = false;
    std::string host;
    int port = 0;
    std::string path;
};

/** The URL itself is not part of any text: it may carry a password, which is one of the errors. */
[[noreturn]] void ThrowMalformed(const std::string& what)
{
    throw InvalidArgumentException("The URL is malformed: " + what + ".");
}

/** Takes the scheme and its `://` off the front of `rest`. */
bool TakeScheme(std::string_view& rest)
{
    constexpr std::string_view Separator = "://";
    const std::size_t end = rest.find(Separator);
    const std::string scheme = StringUtil::ToLower(rest.substr(0, end));
    if (end == std::string_view::npos || (scheme != "https" && scheme != "http")) {
        ThrowMalformed("it does not begin with \"https://\" or \"http://\"");
    }
    rest.remove_prefix(end + Separator.size());
    return scheme == "https";
}

/** Takes the host off the front of `authority` and leaves the port with its colon. */
std::string TakeHost(std::string_view& authority)
{
    const bool bracketed = !authority.empty() && authority.front() == '[';
    const std::size_t end = bracketed ? authority.find(']') : authority.rfind(':');
    std::string host(
        bracketed && end != std::string_view::npos ? authority.substr(1, end - 1)
                                                   : authority.substr(0, end));
    const bool hasColon = host.find(':') != std::string::npos;
    if (!IsHost(host) || bracketed != hasColon) {
        ThrowMalformed("\"" + host + "\" is not a host name or IP address");
    }
    authority.remove_prefix(
        end == std::string_view::npos ? authority.size() : end + (bracketed ? 1 : 0));
    return host;
}

int ParsePort(std::string_view text, int defaultPort)
{
    if (text.empty()) {
        return defaultPort;
    }
    int port = 0;
    const char* const last = text.data() + text.size();
    const auto [end, error] = std::from_chars(text.data() + 1, last, port);
    if (text.front() != ':' || error != std::errc() || end != last || port < 1 || port > 65535) {
        ThrowMalformed("its port does not lie between 1 and 65535");
    }
    return port;
}

UrlParts Parse(std::string_view rest)
{
    UrlParts parts;
    parts.isHttps = TakeScheme(rest);
    std::string_view authority = rest.substr(0, rest.find_first_of("/?#"));
    rest.remove_prefix(authority.size());
    if (authority.find('@') != std::string_view::npos) {
        ThrowMalformed("it has a user name or password");
    }
    parts.host = TakeHost(authority);
    parts.port = ParsePort(authority, parts.isHttps ? HttpsPort : HttpPort);
    if (rest.find('#') != std::string_view::npos) {
        ThrowMalformed("it has a fragment");
    }
    // An empty path is sent as `/` [RFC 9112 3.2.1].
    parts.path = (rest.empty() || rest.front() == '?' ? "/" : "") + std::string(rest);
    if (!IsRequestTarget(parts.path)) {
        ThrowMalformed("its path has a character that must be percent-encoded");
    }
    return parts;
}

} // namespace

void ParseHttpURL(
    const std::string& url, bool& isHttps, std::string& host, int& port, std::string& path)
{
    UrlParts parts = Parse(url);
    isHttps = parts.isHttps;
    host = std::move(parts.host);
    port = parts.port;
    path = std::move(parts.path);
}

} // namespace Quillon::Http
