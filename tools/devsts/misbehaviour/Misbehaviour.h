#pragma once

#include <optional>
#include <string>
#include <vector>

namespace DevSts {

/** One thing that a server does: the name of an act of `Script`, and what it takes. */
struct Act
{
    std::string name;
    std::string text;
    long number = 1;
};

/** How its TLS differs from that of an honest server. */
struct TlsFaults
{
    std::string certificate = "honest"; ///< see `IssueIdentity`
    std::string version;                ///< the only one that is spoken; empty: all since 1.2
    std::string ciphers;                ///< of TLS 1.2 and below; empty: the usual ones
    std::vector<Act> instead;           ///< done on the bare connection, in place of the handshake
    bool cutsHandshake = false;         ///< after as many octets as the parameter says
    bool changesHandshake = false;      ///< the octet at that place
    std::optional<int> verdict; ///< demands a client certificate; OpenSSL's code of its judgement
};

/** A row of the table of what a server may do wrong, and how. */
struct Misbehaviour
{
    std::string name;
    std::string about;
    bool isOverHttp = true;
    bool isOverHttps = true;
    std::optional<long> parameter; ///< where it happens, if the row is about every place
    TlsFaults tls;
    std::vector<Act> acts;
};

/** The table. A row with a parameter has its first value. */
const std::vector<Misbehaviour>& ListMisbehaviours();

/**
 * The row of that name, which may end with a colon and the value of the parameter.
 *
 * @throws std::invalid_argument  there is none.
 */
Misbehaviour FindMisbehaviour(const std::string& name);

} // namespace DevSts
