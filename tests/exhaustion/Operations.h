#pragma once

#include "Exhaust.h"

#include "ssoClient/SecurityTokenService.h"
#include "support/DevStsProcess.h"

#include <memory>
#include <string>
#include <vector>

/** What is exhausted. */
namespace Exhaustion {

using TokenPtr = boost::shared_ptr<const SsoClient::SamlToken>;

/** Reading alone: documents, certificates and keys. */
std::vector<Operation> GetReadings();

/** Signing with one key. */
Operation GetSigning();

/** Judging genuine tokens and assertions, and one that breaks each of the rules. */
std::vector<Operation> GetJudgements();

/** A token service in a process of its own, and a client of it. */
class Client
{
public:
    /**
     * @param options  of the command line of the token service.
     * @param host     the name or the address by which it is reached.
     */
    explicit Client(
        const std::vector<std::string>& options = {}, const std::string& host = "127.0.0.1");

    /** Every way to a token, and the other operations. All are HTTPS unless the options say else.
     */
    std::vector<Operation> GetOperations() const;

    /** The same without waiting; what comes of it is awaited. */
    std::vector<Operation> GetAsyncOperations() const;

    /** Everything from the certificates on is made for each run. */
    Operation GetFirstAcquisition() const;

    SsoClient::SecurityTokenServiceConfig MakeConfig() const;
    boost::shared_ptr<SsoClient::SecurityTokenService> MakeService() const;
    const Testing::DevStsProcess& GetServer() const { return *_server; }

private:
    boost::shared_ptr<SsoClient::SecurityTokenService> GetService() const;
    TokenPtr GetToken() const;

    std::shared_ptr<Testing::DevStsProcess> _server;
    std::string _url;
    mutable boost::shared_ptr<SsoClient::SecurityTokenService> _service;
    mutable TokenPtr _token;
    mutable std::vector<Quillon::Ref<Quillon::Ssl::SSLContext>> _contexts;
};

SsoClient::TokenSpec MakeSpec();

} // namespace Exhaustion
