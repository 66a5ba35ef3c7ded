#include "http/ClientResponseImpl.h"

#include <utility>

namespace Quillon::Http {

namespace {

class ClientResponseImpl final : public ClientResponse
{
public:
    ClientResponseImpl(HttpStatus status, std::string body)
        : _status(std::move(status))
        , _body(CreateStringReader(std::move(body)))
    {}

    const HttpStatus& GetStatus() const noexcept override { return _status; }
    const Ref<Reader>& GetBody() const noexcept override { return _body; }

private:
    const HttpStatus _status;
    const Ref<Reader> _body;
};

} // namespace

Ref<ClientResponse> MakeClientResponse(HttpStatus status, std::string body)
{
    return Ref<ClientResponse>(new ClientResponseImpl(std::move(status), std::move(body)));
}

} // namespace Quillon::Http
