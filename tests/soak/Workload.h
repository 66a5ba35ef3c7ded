#pragma once

#include "Ledger.h"

#include "ssoClient/SecurityTokenService.h"
#include "support/DevStsProcess.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <atomic>
#include <random>
#include <string>
#include <vector>

namespace Soak {

using TokenPtr = boost::shared_ptr<const SsoClient::SamlToken>;
using ServicePtr = boost::shared_ptr<SsoClient::SecurityTokenService>;

inline constexpr unsigned Users = 16;

/** Makes the users known to a token service that has not been asked anything yet. */
void AddUsers(const Testing::DevStsProcess& server);

std::string GetUser(unsigned number);
std::string GetPassword(unsigned number);

/** @param timeoutMs  of one exchange. */
ServicePtr MakeService(
    const std::string& url,
    const std::string& authorities,
    long long timeoutMs,
    bool reuses = false);

SsoClient::TokenSpec MakeSpec();

/** How a client negotiates; empty for not at all. */
struct Kerberos
{
    std::string keytab;
    std::string url; ///< the service as it is named in tickets
};

/** What one of the threads does, without an end. Its own services are shared with all others. */
class Workload
{
public:
    Workload(
        const std::vector<ServicePtr>& services, Kerberos kerberos, Ledger& ledger, unsigned seed);

    /** One operation, drawn by chance. */
    void RunOne();

    /** An asynchronous acquisition; waits only if there are many. */
    void StartAcquisition();

    /** Waits until every asynchronous operation has ended. */
    void AwaitAsync() const;

private:
    unsigned Draw(unsigned count);
    const SsoClient::SecurityTokenService& DrawService();
    template <class Action>
    void Enter(const Action& action);

    void AcquireByPassword();
    void AcquireByCertificate();
    void Exchange();
    void Renew();
    void Validate();
    void Negotiate();
    void Verify();
    void StartOne();

    const std::vector<ServicePtr>& _services;
    const Kerberos _kerberos;
    Ledger& _ledger;
    std::mt19937 _random;
    TokenPtr _token; ///< of the solution user, once there is one
    std::atomic<long> _pending{0};
};

} // namespace Soak
