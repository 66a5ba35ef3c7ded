#pragma once

#include "devsts/wire/Clock.h"
#include "devsts/wire/Xml.h"

#include <optional>
#include <string>
#include <vector>

// A request as it was read; nothing in it is verified yet.

namespace DevSts {

enum class Operation
{
    ISSUE,
    RENEW,
    VALIDATE,
    CONTINUE ///< a further leg of a negotiation that began with ISSUE
};
enum class KeyType
{
    BEARER,
    PUBLIC_KEY
};

struct Interval
{
    TimePoint created;
    TimePoint expires;
};

struct UsernameToken
{
    std::string name;
    std::string password;
};

struct AdviceAttribute
{
    std::string name;
    std::vector<std::string> values;
};

struct Advice
{
    std::string source;
    std::vector<AdviceAttribute> attributes;
};

/** The content of wst:RequestSecurityToken, as far as the operation has it. */
struct TokenRequest
{
    KeyType keyType = KeyType::BEARER;
    std::optional<Interval> lifetime;
    bool renewable = false;
    bool delegable = false;
    std::optional<std::string> delegateTo;
    std::vector<std::string> audience;
    std::vector<Advice> advice;
    std::optional<std::string> useKeySig;
    xmlNode* target = nullptr; ///< the assertion to renew or to validate
};

/** One leg of a negotiation. [WST13 8.2] */
struct NegotiationLeg
{
    std::string context; ///< the client's own at first, then that of this STS
    std::string bytes;
};

struct Request
{
    XmlDocument doc; ///< owns every node below
    Operation operation = Operation::ISSUE;
    xmlNode* body = nullptr;
    xmlNode* timestamp = nullptr;
    Interval freshness;
    std::optional<UsernameToken> usernameToken;
    xmlNode* presentedAssertion = nullptr;
    xmlNode* binaryToken = nullptr;
    xmlNode* signature = nullptr;
    TokenRequest token;
    std::optional<NegotiationLeg> leg;
};

} // namespace DevSts
