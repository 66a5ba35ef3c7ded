#include "http/hostSyntax.h"

#include "quillon/Exceptions.h"

#include <algorithm>
#include <arpa/inet.h>

namespace Quillon::Http {

namespace {

constexpr std::size_t MaxHostLength = 253; // [RFC 1035 2.3.4], without the root's dot
constexpr std::size_t MaxLabelLength = 63;
constexpr int MaxPort = 65535;

bool IsDigit(char character) noexcept
{
    return character >= '0' && character <= '9';
}

bool IsLetterOrDigit(char character) noexcept
{
    return IsDigit(character) || (character >= 'a' && character <= 'z')
           || (character >= 'A' && character <= 'Z');
}

bool IsLabel(std::string_view label) noexcept
{
    return !label.empty() && label.size() <= MaxLabelLength
           && std::all_of(label.begin(), label.end(), [](char character) {
                  return IsLetterOrDigit(character) || character == '-' || character == '_';
              });
}

bool IsTargetCharacter(char character) noexcept
{
    constexpr std::string_view Others = "-._~!$&'()*+,;=:@/?%";
    return IsLetterOrDigit(character) || Others.find(character) != std::string_view::npos;
}

/** What ends in a number would be read as an abbreviated IPv4 address: decimal or `0x` form. */
bool IsNumber(std::string_view label) noexcept
{
    const bool isHex = label.size() >= 2 && label[0] == '0' && (label[1] == 'x' || label[1] == 'X');
    return isHex ? label.find_first_not_of("0123456789abcdefABCDEF", 2) == std::string_view::npos
                 : std::all_of(label.begin(), label.end(), IsDigit);
}

} // namespace

bool IsIpAddress(const std::string& text) noexcept
{
    in6_addr address{};
    return text.find('\0') == std::string::npos
           && (inet_pton(AF_INET, text.c_str(), &address) == 1
               || inet_pton(AF_INET6, text.c_str(), &address) == 1);
}

bool IsHost(const std::string& text) noexcept
{
    if (IsIpAddress(text)) {
        return true;
    }
    if (text.size() > MaxHostLength) {
        return false;
    }
    std::string_view rest = text;
    for (std::size_t dot = rest.find('.'); dot != std::string_view::npos; dot = rest.find('.')) {
        if (!IsLabel(rest.substr(0, dot))) {
            return false;
        }
        rest.remove_prefix(dot + 1);
    }
    return IsLabel(rest) && !IsNumber(rest);
}

bool IsRequestTarget(std::string_view text) noexcept
{
    return !text.empty() && text.front() == '/'
           && std::all_of(text.begin(), text.end(), IsTargetCharacter);
}

void RequireHost(const std::string& host)
{
    if (!IsHost(host)) {
        throw InvalidArgumentException("\"" + host + "\" is not a host name or IP address.");
    }
}

void RequirePort(int port)
{
    if (port < 1 || port > MaxPort) {
        throw InvalidArgumentException(
            "The port " + std::to_string(port) + " does not lie between 1 and 65535.");
    }
}

} // namespace Quillon::Http
