#include "http/ReplyCollector.h"

#include "quillon/StringUtil.h"

#include <charconv>

namespace Quillon::Http {

namespace {

constexpr int FirstFinalStatus = 200;

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

} // namespace

bool ReplyCollector::AddHeaderLine(std::string_view line)
{
    _headerBytes += line.size();
    if (_headerBytes > ReplyLimits::MaxHeaderBytes) {
        _problem =
            "has more than " + std::to_string(ReplyLimits::MaxHeaderBytes) + " bytes of headers";
        return false;
    }
    if (_expectsStatus) {
        return AddStatusLine(line);
    }
    line = Trim(line);
    if (line.empty()) {
        _expectsStatus = _status.code < FirstFinalStatus;
        return true;
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
    _expectsStatus = false;
    return true;
}

bool ReplyCollector::AddField(std::string_view name, std::string_view value)
{
    const std::string lowerName = StringUtil::ToLower(name);
    const std::string lowerValue = StringUtil::ToLower(value);
    const bool unwanted = lowerName == "content-encoding"    ? lowerValue != "identity"
                          : lowerName == "transfer-encoding" ? lowerValue != "chunked"
                                                             : false;
    if (unwanted) {
        _problem = "is encoded as \"" + std::string(value) + "\", which nobody asked for";
    }
    return !unwanted;
}

bool ReplyCollector::AddBody(std::string_view piece)
{
    if (piece.size() > ReplyLimits::MaxBodyBytes - _body.size()) {
        _problem = "is larger than " + std::to_string(ReplyLimits::MaxBodyBytes) + " bytes";
        return false;
    }
    _body.append(piece);
    return true;
}

} // namespace Quillon::Http
