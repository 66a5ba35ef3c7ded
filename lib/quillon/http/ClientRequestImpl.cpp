#include "http/ClientRequestImpl.h"

#include "http/hostSyntax.h"

#include "quillon/StringUtil.h"

#include <algorithm>
#include <utility>

namespace Quillon::Http {

namespace {

constexpr long long DefaultTimeout = 240'000'000;

bool IsTokenCharacter(unsigned char character) noexcept
{
    constexpr std::string_view Separators = "\"(),/:;<=>?@[\\]{}";
    return character > 0x20 && character < 0x7F
           && Separators.find(static_cast<char>(character)) == std::string_view::npos;
}

bool IsControl(unsigned char character) noexcept
{
    return (character < 0x20 && character != '\t') || character == 0x7F;
}

void RequirePositive(long long timeout)
{
    if (timeout <= 0) {
        throw InvalidArgumentException(
            "The time-out of " + std::to_string(timeout) + " microseconds is not positive.");
    }
}

} // namespace

bool HeaderNameLess::operator()(const std::string& a, const std::string& b) const
{
    return StringUtil::ToLower(a) < StringUtil::ToLower(b);
}

ClientRequestImpl::ClientRequestImpl(std::string path)
    : _path(std::move(path))
    , _writer(new BodyWriter)
    , _timeout(DefaultTimeout)
{}

void ClientRequestImpl::SetHeader(const std::string& name, const std::string& value)
{
    if (name.empty() || !std::all_of(name.begin(), name.end(), IsTokenCharacter)) {
        throw InvalidArgumentException("\"" + name + "\" is not the name of a header field.");
    }
    if (std::any_of(value.begin(), value.end(), IsControl)) {
        throw InvalidArgumentException(
            "The value of the header field " + name + " has a control character.");
    }
    _headers[name] = value;
}

void ClientRequestImpl::SetTimeout(long long timeout)
{
    RequirePositive(timeout);
    _timeout = timeout;
}

void ClientRequestImpl::SetConnectTimeout(long long timeout)
{
    RequirePositive(timeout);
    _connectTimeout = timeout;
}

void ClientRequestImpl::BodyWriter::Write(const char* bytes, std::size_t size)
{
    text.Append({bytes, size});
}

void CreateHttpRequest(HttpMethod method, const std::string& path, Ref<ClientRequest>& out)
{
    if (method != HttpMethod::POST) {
        throw InvalidArgumentException(
            "There is no HTTP method " + std::to_string(static_cast<int>(method)) + ".");
    }
    if (!IsRequestTarget(path)) {
        throw InvalidArgumentException("\"" + path + "\" is not the path of a URL.");
    }
    out = Ref<ClientRequest>(new ClientRequestImpl(path));
}

} // namespace Quillon::Http
