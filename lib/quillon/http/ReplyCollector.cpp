#include "http/ReplyCollector.h"

#include "quillon/StringUtil.h"

#include <algorithm>
#include <charconv>

namespace Quillon::Http {

namespace {

constexpr int FirstFinalStatus = 200;

/** Framing takes at most as much as the largest body, or a server could send it for ever. */
constexpr std::size_t MaxWireBytes = 2 * ReplyLimits::MaxBodyBytes;

/** How much of the server's own words a text repeats. */
constexpr std::size_t MaxEchoedBytes = 200;

/** Without optional white space [RFC 9110 5.6.3] and line end. */
std::string_view Trim(std::string_view text) noexcept
{
    constexpr std::string_view Blanks = " \t\r\n";
    const std::size_t first = text.find_first_not_of(Blanks);
    if (first == std::string_view::npos) {
        return {};
    }
    return text.substr(first, text.find_last_not_of(Blanks) - first + 1);
}

bool IsDigit(char character) noexcept
{
    return character >= '0' && character <= '9';
}

std::string DescribeLimit(std::size_t bytes)
{
    return "is larger than " + std::to_string(bytes) + " bytes";
}

} // namespace

std::string ReplyCollector::DescribeTooManyHeaders()
{
    return "has more than " + std::to_string(ReplyLimits::MaxHeaderBytes) + " bytes of headers";
}

bool ReplyCollector::AddHeaderLine(std::string_view line)
{
    _headerBytes += line.size();
    if (_headerBytes > ReplyLimits::MaxHeaderBytes) {
        _problem = DescribeTooManyHeaders();
        return false;
    }
    if (_next == Next::STATUS) {
        return AddStatusLine(line);
    }
    if (_next != Next::FIELDS) {
        return true; // a trailer
    }
    line = Trim(line);
    if (line.empty()) {
        return EndHead();
    }
    const std::size_t colon = line.find(':');
    return colon == std::string_view::npos
           || AddField(Trim(line.substr(0, colon)), Trim(line.substr(colon + 1)));
}

bool ReplyCollector::AddStatusLine(std::string_view line)
{
    const std::size_t blank = line.find(' ');
    line = blank == std::string_view::npos ? std::string_view() : Trim(line.substr(blank));
    int code = 0;
    const auto [end, error] = std::from_chars(line.data(), line.data() + line.size(), code);
    const std::size_t digits = static_cast<std::size_t>(end - line.data());
    const bool delimited = digits == line.size() || line[digits] == ' ';
    if (error != std::errc() || digits != 3 || code < 100 || !delimited) {
        _problem = "has no valid status line";
        return false;
    }
    _status.code = code;
    _status.reasonPhrase = Trim(line.substr(digits));
    _location.clear();
    _date.clear();
    _retryAfter.clear();
    _hasLength = false;
    _announcesEnd = false;
    _contentLength.reset();
    _next = Next::FIELDS;
    return true;
}

bool ReplyCollector::AddField(std::string_view name, std::string_view value)
{
    const std::string lowerName = StringUtil::ToLower(name);
    const std::string lowerValue = StringUtil::ToLower(value);
    if (_isObserved) {
        NoteField(lowerName, value);
    }
    if (lowerName == "content-length") {
        _hasLength = true;
        return !WantsBody() || AddContentLength(value);
    }
    if (lowerName == "transfer-encoding") {
        _hasLength = true;
        return AddEncoding(value, lowerValue == "chunked");
    }
    if (lowerName == "content-encoding") {
        return AddEncoding(value, lowerValue.empty() || lowerValue == "identity");
    }
    if (lowerName == "connection") {
        _announcesEnd = _announcesEnd || lowerValue == "close";
    }
    return true;
}

void ReplyCollector::NoteField(const std::string& lowerName, std::string_view value)
{
    if (lowerName == "location") {
        _location = value;
    } else if (lowerName == "date") {
        _date = value;
    } else if (lowerName == "retry-after") {
        _retryAfter = value;
    }
}

bool ReplyCollector::WantsBody() const
{
    return _status.code >= FirstFinalStatus && (_wantsBody == nullptr || _wantsBody(_status.code));
}

bool ReplyCollector::AddEncoding(std::string_view value, bool isWanted)
{
    if (isWanted || !WantsBody()) {
        return true;
    }
    _problem = "is encoded as \"" + std::string(value.substr(0, MaxEchoedBytes))
               + "\", which nobody asked for";
    return false;
}

// [RFC 9112 6.3]: which of two lengths is meant cannot be known.
bool ReplyCollector::AddContentLength(std::string_view value)
{
    if (value.empty() || !std::all_of(value.begin(), value.end(), &IsDigit)) {
        _problem = "has no valid Content-Length";
    } else if (_contentLength && *_contentLength != value) {
        _problem = "has more than one Content-Length";
    } else {
        std::size_t length = 0;
        const auto end = value.data() + value.size();
        const bool isNumber = std::from_chars(value.data(), end, length).ec == std::errc();
        if (!isNumber || length > ReplyLimits::MaxBodyBytes) {
            _problem = DescribeLimit(ReplyLimits::MaxBodyBytes);
        }
        _contentLength = value;
    }
    return _problem.empty();
}

/**
 * Interim replies have no body [RFC 9110 15.2], so an unknown one that announces a body, or the end
 * of the connection, is not one. Nobody asked to switch protocols, so 101 is an answer as well.
 */
bool ReplyCollector::IsInterim() const noexcept
{
    switch (_status.code) {
    case 100: // Continue
    case 102: // Processing
    case 103: // Early Hints
        return true;
    case 101: // Switching Protocols
        return false;
    default:
        return _status.code < FirstFinalStatus && !_hasLength && !_announcesEnd;
    }
}

bool ReplyCollector::EndsWithConnection() const noexcept
{
    constexpr int NoContent = 204;
    return _next == Next::BODY && !_hasLength && _status.code != NoContent;
}

bool ReplyCollector::EndHead() noexcept
{
    _next = IsInterim() ? Next::STATUS : WantsBody() ? Next::BODY : Next::NOTHING;
    return !IsAnswered();
}

bool ReplyCollector::AddBody(std::string_view piece)
{
    if (piece.size() > ReplyLimits::MaxBodyBytes - _body.size()) {
        _problem = DescribeLimit(ReplyLimits::MaxBodyBytes);
        return false;
    }
    _body.append(piece);
    return true;
}

void ReplyCollector::AddWireBytes(std::size_t count)
{
    _wireBytes += count;
    if (_wireBytes > MaxWireBytes && _problem.empty()) {
        _problem = "takes more than " + std::to_string(MaxWireBytes) + " bytes on the wire";
    }
}

} // namespace Quillon::Http
