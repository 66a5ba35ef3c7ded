#pragma once

#include "Harness.h"
#include "support/Initiator.h"

namespace DevStsTests {

using Testing::Initiator;
using Testing::Mechanism;

/** The Kerberos realm that all tests share. */
class Realm
{
public:
    static const Realm& Shared();

    std::string File(const std::string& name) const;

    /** Where the ticket-granting ticket of `principal` lies, alice or mallory. */
    std::string Tickets(const std::string& principal) const;

private:
    Realm();
    ~Realm();

    class Impl;
    std::unique_ptr<Impl> _impl;
};

/** A copy of the shared state that collects the replays of all tests. */
const std::filesystem::path& NegotiationState();

constexpr const char* ServicePrincipal = "HTTP/127.0.0.1@EXAMPLE.TEST";

std::string ToBase64(const std::string& bytes);
std::string FromBase64(const std::string& text);

std::string BinaryExchange(const std::string& base64);

/** A body that begins a negotiation for a bearer token; `extras` stand before the leg. */
std::string FirstBody(
    const std::string& leg, const std::string& keyType = "Bearer", const std::string& extras = "");

std::string FirstRequest(const std::string& leg);
std::string NextBody(const std::string& context, const std::string& leg);
std::string NextRequest(const std::string& context, const std::string& leg);

/**
 * An honest first leg that offers Kerberos and holds no ticket yet, so that the service has to
 * ask for one.
 */
std::string OfferOfKerberos();

/** A server that negotiates. */
class NegotiationTest : public ServerTest
{
protected:
    explicit NegotiationTest(std::size_t pendingNegotiations = 1000);

    static Initiator Alice(OM_uint32 flags = GSS_C_MUTUAL_FLAG);

    HttpResult PostNext(const std::string& request, const std::string& cookie);
    HttpResult PostNext(
        const std::string& context, const std::string& leg, const std::string& cookie);

    /** What the client sends back of the cookie that `reply` sets. */
    static std::string CookieOf(const HttpResult& reply);
    static std::string ContextOf(const HttpResult& reply);
    static std::string LegOf(const HttpResult& reply);

    /** Begins a negotiation that then waits for its second leg. */
    HttpResult BeginToWait();
};

} // namespace DevStsTests
