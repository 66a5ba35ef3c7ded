#include "fuzz/fuzzing.h"
#include "quillon/Exceptions.h"
#include "quillon/Reader.h"
#include "ssoClient/protocol/ResponseHandlerImpl.h"

// A reply of any shape ends in a result or in one of the library's exceptions.
namespace {

using namespace SsoClient;

void Handle(unsigned operation, const ResponseHandler& handler, Quillon::Reader* reply)
{
    std::string tokenXml;
    SPNegoResponse response;
    switch (operation) {
    case 0:
        handler.HandleAcquireTokenResponse(reply, tokenXml);
        break;
    case 1:
        handler.HandleRenewTokenResponse(reply, tokenXml);
        break;
    case 2:
        handler.HandleValidateSubjectResponse(reply);
        break;
    default:
        handler.HandleSPNegoResponse(reply, response);
    }
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string text(Fuzzing::ToText(data, size));
    for (unsigned operation = 0; operation < 4; ++operation) {
        try {
            Handle(operation, ResponseHandlerImpl(), Quillon::CreateStringReader(text).get());
        } catch (const Quillon::Exception& error) {
            Fuzzing::Require(error.what()[0] != '\0', "an exception without a text");
        }
    }
    return 0;
}
