#include "NegotiationHarness.h"
#include "Requests.h"

namespace DevStsTests {

namespace {

struct Case
{
    std::string name;
    std::string from; ///< stands once in the good request
    std::string to;
    std::string text;
};

std::string CaseName(const testing::TestParamInfo<Case>& info)
{
    return info.param.name;
}

void PrintTo(const Case& instance, std::ostream* out)
{
    *out << instance.name;
}

const std::string Context = "urn:uuid:5a3c1f6e-0d4b-4c57-9d3e-2f8a7b6c5d4e";
const std::string ContextAttribute = " Context=\"" + Context + "\"";
const std::string WstText = "'http://docs.oasis-open.org/ws-sx/ws-trust/200512'";
const std::string SpnegoType = "http://schemas.xmlsoap.org/ws/2005/02/trust/spnego";
const std::string Base64Type = "http://docs.oasis-open.org/wss/2004/01/"
                               "oasis-200401-wss-soap-message-security-1.0#Base64Binary";
const std::string Leg = ">" + ToBase64(OfferOfKerberos()) + "<";

/** What may be wrong with the leg of any request. */
std::vector<Case> LegCases()
{
    return {
        {"EmptyContext", Context, "", "The Context is empty"},
        {"WrongValueType",
         "trust/spnego\"",
         "trust/tlsnego\"",
         "The ValueType of the BinaryExchange must be '" + SpnegoType
             + "', not 'http://schemas.xmlsoap.org/ws/2005/02/trust/tlsnego'"},
        {"MissingValueType",
         " ValueType=\"" + SpnegoType + "\"",
         "",
         "Element 'BinaryExchange' has no attribute 'ValueType'"},
        {"WrongEncodingType",
         "#Base64Binary",
         "#HexBinary",
         "The EncodingType of the BinaryExchange must be '" + Base64Type
             + "', not 'http://docs.oasis-open.org/wss/2004/01/"
               "oasis-200401-wss-soap-message-security-1.0#HexBinary'"},
        {"MissingEncodingType",
         " EncodingType=\"" + Base64Type + "\"",
         "",
         "Element 'BinaryExchange' has no attribute 'EncodingType'"},
        {"OtherAttribute",
         "<wst:BinaryExchange ",
         "<wst:BinaryExchange Id=\"a\" ",
         "Element 'BinaryExchange' has an unexpected attribute 'Id'"},
        {"ElementInLeg", Leg, "><a/><", "Element 'BinaryExchange' must hold text only"},
        {"EmptyLeg", Leg, "><", "The BinaryExchange is empty"},
        {"BlankLeg", Leg, "> \n <", "The BinaryExchange is empty"},
        {"OtherCharacters", Leg, ">ab_=<", "The BinaryExchange is not Base64"},
        {"MissingPadding", Leg, ">YWI<", "The BinaryExchange is not Base64"},
        {"TooMuchPadding", Leg, ">YWI==<", "The BinaryExchange is not Base64"},
        {"TextAfterPadding", Leg, ">YWI=YWI=<", "The BinaryExchange is not Base64"},
        {"UnusedBitsSet", Leg, ">YWJ=<", "The BinaryExchange is not Base64"},
        {"EndMark", Leg, ">YWJj-<", "The BinaryExchange is not Base64"}};
}

class MalformedFirstLeg : public NegotiationTest, public testing::WithParamInterface<Case>
{};

TEST_P(MalformedFirstLeg, IsRefusedWithTheReason)
{
    const Case& instance = GetParam();
    const HttpResult result =
        PostIssue(Replaced(FirstRequest(OfferOfKerberos()), instance.from, instance.to));
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), instance.text);
}

INSTANTIATE_TEST_SUITE_P(Leg, MalformedFirstLeg, testing::ValuesIn(LegCases()), CaseName);

INSTANTIATE_TEST_SUITE_P(
    Body,
    MalformedFirstLeg,
    testing::Values(
        Case{
            "MissingContext",
            ContextAttribute,
            "",
            "Element 'RequestSecurityToken' has no attribute 'Context'"},
        Case{
            "OtherAttributeOfRequest",
            ContextAttribute,
            ContextAttribute + " Id=\"a\"",
            "Element 'RequestSecurityToken' has an unexpected attribute 'Id'"},
        Case{
            "ContextInNamespace",
            " Context=",
            " wst:Context=",
            "Element 'RequestSecurityToken' has an unexpected attribute 'Context'"},
        Case{
            "UseKeyAfterLeg",
            "</wst:BinaryExchange>",
            "</wst:BinaryExchange><wst:UseKey Sig=\"a\"/>",
            "Unexpected 'UseKey' under 'RequestSecurityToken'"},
        Case{
            "TwoLegs",
            "</wst:BinaryExchange>",
            "</wst:BinaryExchange>" + BinaryExchange("YWI="),
            "Unexpected 'BinaryExchange' under 'RequestSecurityToken'"},
        Case{
            "OtherChild",
            "</wst:BinaryExchange>",
            "</wst:BinaryExchange><wst:Other/>",
            "Unexpected 'Other' under 'RequestSecurityToken'"},
        Case{
            "LegFirst",
            "<wst:KeyType>",
            BinaryExchange("YWI=") + "<wst:KeyType>",
            "Expected element 'KeyType' of namespace " + WstText
                + " under 'RequestSecurityToken', found 'BinaryExchange'"}),
    CaseName);

class MalformedNextLeg : public NegotiationTest, public testing::WithParamInterface<Case>
{};

TEST_P(MalformedNextLeg, IsRefusedWithTheReason)
{
    const Case& instance = GetParam();
    const HttpResult result =
        PostNext(Replaced(NextRequest(Context, OfferOfKerberos()), instance.from, instance.to), "");
    EXPECT_EQ(FaultText(result, "wst:InvalidRequest"), instance.text);
}

INSTANTIATE_TEST_SUITE_P(Leg, MalformedNextLeg, testing::ValuesIn(LegCases()), CaseName);

INSTANTIATE_TEST_SUITE_P(
    Body,
    MalformedNextLeg,
    testing::Values(
        Case{
            "MissingContext",
            ContextAttribute,
            "",
            "Element 'RequestSecurityTokenResponse' has no attribute 'Context'"},
        Case{
            "OtherAttributeOfResponse",
            ContextAttribute,
            ContextAttribute + " Id=\"a\"",
            "Element 'RequestSecurityTokenResponse' has an unexpected attribute 'Id'"},
        Case{
            "TwoLegs",
            "</wst:BinaryExchange>",
            "</wst:BinaryExchange>" + BinaryExchange("YWI="),
            "Unexpected 'BinaryExchange' under 'RequestSecurityTokenResponse'"},
        Case{
            "TokenTypeBeforeLeg",
            "<wst:BinaryExchange ",
            "<wst:TokenType/><wst:BinaryExchange ",
            "Expected element 'BinaryExchange' of namespace " + WstText
                + " under 'RequestSecurityTokenResponse', found 'TokenType'"},
        Case{
            "TwoResponses",
            "</wst:RequestSecurityTokenResponse>",
            "</wst:RequestSecurityTokenResponse><wst:RequestSecurityTokenResponse/>",
            "Unexpected 'RequestSecurityTokenResponse' under 'Body'"}),
    CaseName);

using MisplacedLeg = NegotiationTest;

TEST_F(MisplacedLeg, FirstRequestUnderTheActionOfTheNextIsRefused)
{
    EXPECT_EQ(
        FaultText(PostNext(FirstRequest(OfferOfKerberos()), ""), "wst:InvalidRequest"),
        "Expected element 'RequestSecurityTokenResponse' of namespace " + WstText
            + " under 'Body', found 'RequestSecurityToken'");
}

TEST_F(MisplacedLeg, NextRequestUnderTheActionOfTheFirstIsRefused)
{
    EXPECT_EQ(
        FaultText(PostIssue(NextRequest(Context, OfferOfKerberos())), "wst:InvalidRequest"),
        "Expected element 'RequestSecurityToken' of namespace " + WstText
            + " under 'Body', found 'RequestSecurityTokenResponse'");
}

TEST_F(MisplacedLeg, ContextWithoutLegIsRefused)
{
    const std::string request = Replaced(
        PasswordRequest(),
        "<wst:RequestSecurityToken ",
        "<wst:RequestSecurityToken" + ContextAttribute + " ");
    EXPECT_EQ(
        FaultText(PostIssue(request), "wst:InvalidRequest"),
        "Element 'RequestSecurityToken' has an unexpected attribute 'Context'");
}

TEST_F(MisplacedLeg, LineBreaksInBase64AreBlanks)
{
    const std::string text = ToBase64(OfferOfKerberos());
    EXPECT_EQ(
        PostIssue(
            Replaced(
                FirstRequest(OfferOfKerberos()), text, text.substr(0, 8) + "\n " + text.substr(8)))
            .status,
        200);
}

} // namespace

} // namespace DevStsTests
