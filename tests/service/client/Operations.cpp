#include "Operations.h"

#include "ssoClient/Descriptions.h"
#include "support/Failure.h"

using namespace SsoClient;

namespace {

constexpr long long LifetimeSec = 300;

constexpr char SpecText[] =
    "`TokenSpec [tokenLifetimeSec=300, delegable=false, delegateTo=<unset>, renewable=false, "
    "confirmationType=0,audienceRestriction=, advice=[]'";

} // namespace

const std::vector<Operation>& GetOperations()
{
    static const std::vector<Operation> operations{
        {"AcquireToken",
         [](const OperationContext& context) {
             context.service.AcquireToken(
                 "alice@example.test", context.password, MakeSpec(LifetimeSec));
         },
         [](const SamlToken&) {
             return std::string("Requested token for subject `alice@example.test', spec ")
                    + SpecText;
         },
         true,
         false},
        {"AcquireTokenByCertificate",
         [](const OperationContext& context) {
             context.service.AcquireTokenByCertificate(MakeSpec(LifetimeSec));
         },
         [](const SamlToken&) { return std::string("Requested token with spec ") + SpecText; }},
        {"AcquireTokenByToken",
         [](const OperationContext& context) {
             context.service.AcquireTokenByToken(context.token, MakeSpec(LifetimeSec));
         },
         [](const SamlToken& token) {
             return "Requested token for " + CreateRedactedDescription(token) + " with spec "
                    + SpecText;
         }},
        {"RenewToken",
         [](const OperationContext& context) {
             context.service.RenewToken(context.token, LifetimeSec);
         },
         [](const SamlToken& token) {
             return "Renewing token " + CreateRedactedDescription(token) + " for 300 more seconds";
         }},
        {"ValidateSubject",
         [](const OperationContext& context) { context.service.ValidateSubject(context.token); },
         [](const SamlToken& token) {
             return "Validating subject of token " + CreateRedactedDescription(token);
         },
         false,
         false}};
    return operations;
}

std::vector<Operation> SelectOperations(bool Operation::*property)
{
    std::vector<Operation> selected;
    for (const Operation& operation : GetOperations()) {
        if (operation.*property) {
            selected.push_back(operation);
        }
    }
    return selected;
}

EveryOperationTest::EveryOperationTest()
{
    TokenSpec spec = MakeSpec();
    spec.renewable = true;
    token = service->AcquireTokenByCertificate(spec);
}

std::string EveryOperationTest::RunOn(const SecurityTokenService& other) const
{
    return GetFailure([&] { GetParam().run({other, *token, AlicesPassword}); });
}
