#include "ssoClient/client/descriptions.h"

#include "support/FakeSamlToken.h"

#include <gmock/gmock.h>

using namespace SsoClient;
using Quillon::System::DateTime;

TEST(WriteDelegate, TellsWhoAndWhen)
{
    const Delegate delegate{{"svc", "example.com"}, DateTime("2011-07-05T09:03:07.042Z")};
    EXPECT_EQ(
        WriteDelegate(&delegate), "{Name: svc; Domain:example.com} at 2011-07-05T09:03:07.042Z");
}

TEST(WriteAdviceAttribute, JoinsEveryValue)
{
    const AdviceAttribute none{"N", {}};
    const AdviceAttribute two{"N", {"X", "Y"}};
    const AdviceAttribute empty{"N", {"", "Y"}};
    EXPECT_EQ(WriteAdviceAttribute(&none), "[source=N, attributes=[]]");
    EXPECT_EQ(WriteAdviceAttribute(&two), "[source=N, attributes=[X, Y]]");
    EXPECT_EQ(WriteAdviceAttribute(&empty), "[source=N, attributes=[, Y]]");
}

TEST(WriteAdvice, ListsItsAttributes)
{
    const Advice one{"S", {{"N", {"X", "Y"}}}};
    const Advice two{"S", {{"N", {}}, {"M", {}}}};
    EXPECT_EQ(WriteAdvice(&one), "Advice [source=S, attributes=[[source=N, attributes=[X, Y]]]]");
    EXPECT_EQ(
        WriteAdvice(&two),
        "Advice [source=S, attributes=[[source=N, attributes=[]], [source=M, attributes=[]]]]");
}

TEST(AsString, SeparatesOnlyAfterText)
{
    const std::vector<PrincipalId> items{{"a", "d"}, {"b", "d"}, {"c", "d"}};
    EXPECT_EQ(AsString<PrincipalId>(items, &PrincipalId::GetName), "a, b, c");
    EXPECT_EQ(
        AsString<PrincipalId>(
            items,
            [](const PrincipalId* item) {
                return item->GetName() == "a" ? std::string() : item->GetName();
            }),
        "b, c");
    EXPECT_EQ(
        AsString<PrincipalId>(
            items,
            [](const PrincipalId* item) {
                return item->GetName() == "b" ? std::string() : item->GetName();
            }),
        "a, , c");
    EXPECT_EQ(AsString<PrincipalId>({}, &PrincipalId::GetName), "");
}

TEST(AsString, RefusesEmptyFunction)
{
    const std::vector<PrincipalId> items{{"a", "d"}};
    EXPECT_THROW(
        AsString<PrincipalId>(items, boost::function<std::string(const PrincipalId*)>()),
        boost::bad_function_call);
}

TEST(WriteTokenSpec, DescribesMinimalSpec)
{
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    spec.audienceRestriction = {"b", "a"};
    EXPECT_EQ(
        WriteTokenSpec(spec),
        "TokenSpec [tokenLifetimeSec=300, delegable=false, delegateTo=<unset>, renewable=false, "
        "confirmationType=0,audienceRestriction=a, b, advice=[]");
}

TEST(WriteTokenSpec, DescribesFullSpec)
{
    TokenSpec spec;
    spec.tokenLifetimeSec = -9'000'000'000'000;
    spec.delegable = true;
    spec.delegateTo = "proxy%7";
    spec.renewable = true;
    spec.confirmation = static_cast<TokenSpec::Confirmation>(7);
    spec.advice = {{"S", {}}, {"T", {}}};
    EXPECT_EQ(
        WriteTokenSpec(spec),
        "TokenSpec [tokenLifetimeSec=-9000000000000, delegable=true, delegateTo=proxy%7, "
        "renewable=true, confirmationType=7,audienceRestriction=, "
        "advice=[Advice [source=S, attributes=[]], Advice [source=T, attributes=[]]]");
}

TEST(CreateRedactedDescription, DescribesPlainToken)
{
    EXPECT_EQ(
        CreateRedactedDescription(FakeSamlToken()),
        "SamlToken [subject={Name: jdoe; Domain:example.com}, groups=[], delegationChain=[], "
        "startTime=2011-07-05T09:00:00.000Z, expirationTime=2011-07-05T10:00:00.000Z, "
        "renewable=false, delegable=false, isSolution=false,confirmationType=0]");
}

TEST(CreateRedactedDescription, DescribesFullTokenWithoutItsSecrets)
{
    FakeSamlToken token;
    token.id = "_secret-id";
    token.xml = "<secret/>";
    token.renewable = true;
    token.delegable = true;
    token.solution = true;
    token.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
    token.groups = {{"Users", "example.com"}, {"Admins", "example.com"}};
    token.delegationChain = {
        {{"a", "d"}, DateTime("2011-07-05T09:01:00Z")},
        {{"b", "d"}, DateTime("2011-07-05T09:02:00Z")}};
    EXPECT_EQ(
        CreateRedactedDescription(token),
        "SamlToken [subject={Name: jdoe; Domain:example.com}, "
        "groups=[{Name: Users; Domain:example.com}, {Name: Admins; Domain:example.com}], "
        "delegationChain=[{Name: a; Domain:d} at 2011-07-05T09:01:00.000Z, "
        "{Name: b; Domain:d} at 2011-07-05T09:02:00.000Z], "
        "startTime=2011-07-05T09:00:00.000Z, expirationTime=2011-07-05T10:00:00.000Z, "
        "renewable=true, delegable=true, isSolution=true,confirmationType=1]");
}
