#pragma once

#include "CommandLine.h"
#include "DialectOptions.h"
#include "ExchangeRecord.h"
#include "Trust.h"
#include "WaitNotice.h"

#include "quillon/ssl/SSLContext.h"
#include "ssoClient/SecurityTokenService.h"

#include <string>
#include <vector>

/** Where a URL leads. */
struct Server
{
    bool isHttps = false;
    std::string host;
    int port = 0;
};

/** The options of every command that talks to a token service. */
struct ServiceOptions
{
    std::string url;
    std::vector<std::string> trustFiles;
    std::vector<std::string> authorityFiles;
    std::string peer;
    bool insecureHttp = false;
    long long timeoutSec = 240; ///< of each exchange
    bool verbose = false;
    DialectOptions dialect;

    enum class Trust
    {
        REQUIRED,
        OPTIONAL
    };

    /** @param record  is told of the exchanges of the service. */
    void AddTo(const Command& command, ExchangeRecord& record, Trust trust = Trust::REQUIRED);

    /** @throws UsageError  passwords would go there in the clear, and nobody has allowed that. */
    Server RequireServer() const;

    /** The limits of the exchanges. */
    SsoClient::ExchangeOptions GetExchangeOptions() const;

    /**
     * Creates the service, and turns its trace lines on if that is asked for.
     *
     * @param trusted      what `trustFiles` hold.
     * @param identity     of the caller, if there is one.
     * @param credentials  of the caller, if a dialect wants them beside what it presents.
     */
    boost::shared_ptr<SsoClient::SecurityTokenService> CreateService(
        const CertificateList& trusted,
        const boost::optional<SsoClient::HolderOfKeyConfig>& identity = boost::none,
        const boost::optional<SsoClient::PasswordCredentials>& credentials = boost::none) const;

    /** What `call` returns, which asks the service. Says at a terminal when that takes long. */
    template <class Call>
    auto Await(const Presentation& presentation, Call call) const
    {
        const WaitNotice notice(presentation, GetServer(), timeoutSec);
        return call();
    }

private:
    /** The URL without its path. */
    std::string GetServer() const;

    ExchangeRecord* _record = nullptr;
};
