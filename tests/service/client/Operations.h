#pragma once

#include "Harness.h"

#include <functional>
#include <ostream>

/** What every operation needs, so that tests can run over all of them. */
struct OperationContext
{
    const SsoClient::SecurityTokenService& service;
    const SsoClient::SamlToken& token; ///< renewable, bound to the key of the service
    std::string password;              ///< of Alice
};

/** One of the five operations, and what it logs first. */
struct Operation
{
    const char* name;
    std::function<void(const OperationContext&)> run;
    std::function<std::string(const SsoClient::SamlToken&)> getRequestLine;
    bool givesToken = true;
    bool needsIdentity = true;
};

inline std::ostream& operator<<(std::ostream& stream, const Operation& operation)
{
    return stream << operation.name;
}

/** All five, each asking for 300 seconds where it asks for any. */
const std::vector<Operation>& GetOperations();

/** Those of which `property` holds. */
std::vector<Operation> SelectOperations(bool Operation::*property);

inline std::string GetOperationName(const testing::TestParamInfo<Operation>& info)
{
    return info.param.name;
}

/** Runs a test over every operation, against a server that can be reached over plain HTTP. */
class EveryOperationTest : public HttpStsTest, public testing::WithParamInterface<Operation>
{
protected:
    EveryOperationTest();

    /** Runs the operation, on a service with an identity. @return what it throws, see GetFailure.
     */
    std::string Run() const { return RunOn(*service); }
    std::string RunOn(const SsoClient::SecurityTokenService& other) const;

    ServicePtr service = MakeService();
    TokenPtr token;
};
