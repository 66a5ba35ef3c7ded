#pragma once

#include "quillon/Wiped.h"
#include "quillon/http/ClientRequest.h"

#include <algorithm>
#include <limits>
#include <map>
#include <string>

namespace Quillon::Http {

/** Header names are the same whatever their case [RFC 9110 5.1]. */
struct HeaderNameLess
{
    bool operator()(const std::string& a, const std::string& b) const;
};

class ClientRequestImpl final : public ClientRequest
{
public:
    explicit ClientRequestImpl(std::string path);

    void SetHeader(const std::string& name, const std::string& value) override;
    Writer* GetBodyWriter() noexcept override { return _writer.get(); }
    void SetTimeout(long long timeout) override;
    void SetBodyStatuses(StatusTest wantsBody) noexcept override { _wantsBody = wantsBody; }
    void SetConnectTimeout(long long timeout) override;
    void SetObserver(const ExchangeObserver& observer) override { _observer = observer; }

    const std::string& GetPath() const noexcept { return _path; }
    const std::map<std::string, std::string, HeaderNameLess>& GetHeaders() const noexcept
    {
        return _headers;
    }
    const std::string& GetBody() const noexcept { return _writer->text.Get(); }
    long long GetTimeout() const noexcept { return _timeout; }
    StatusTest GetBodyStatuses() const noexcept { return _wantsBody; }
    /** At most the time-out of the whole exchange. */
    long long GetConnectTimeout() const noexcept { return std::min(_connectTimeout, _timeout); }
    const ExchangeObserver& GetObserver() const noexcept { return _observer; }

private:
    class BodyWriter final : public Writer
    {
    public:
        void Write(const char* bytes, std::size_t size) override;

        Wiped text; // may hold a password
    };

    const std::string _path;
    std::map<std::string, std::string, HeaderNameLess> _headers;
    const Ref<BodyWriter> _writer;
    long long _timeout;
    long long _connectTimeout = std::numeric_limits<long long>::max();
    ExchangeObserver _observer;
    StatusTest _wantsBody = nullptr;
};

} // namespace Quillon::Http
