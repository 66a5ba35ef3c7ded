#include "TokenTable.h"

#include <gtest/gtest.h>

#include <ostream>

namespace HostileTests {

namespace {

constexpr std::size_t Thousand = 1000;
constexpr std::size_t Million = 1000000;
constexpr std::size_t MaxBytes = 8388608;

const char XmlError[] = "Quillon::Xml::XMLParseException";
const char ParseError[] = "SsoClient::ParseException";
const char SignatureError[] = "SsoClient::InvalidSignatureException";
const std::vector<Refusal> OverLimit{{XmlError, "", "", ""}};
const std::vector<Refusal> BadSignature{
    {SignatureError, "", "", ""}, {ParseError, "", "Signature syntax error: ", ""}};
const std::vector<Refusal> ThirdTransform{
    {SignatureError,
     "Signature verification error. Transform 'http://www.w3.org/2001/10/xml-exc-c14n#' follows a "
     "canonicalization",
     "",
     ""}};
const std::vector<Refusal> NoList{
    {ParseError, "Signature syntax error: 'InclusiveNamespaces' must be empty", "", ""}};
const std::vector<Refusal> LongList{
    {SignatureError,
     "Signature verification error. More than 64 prefixes in a PrefixList",
     "",
     ""}};
const std::vector<Refusal> NoSubject{{ParseError, "Expected element 'Subject' not found.", "", ""}};

/** A genuine token with `inserted` put before the one place where `mark` stands. */
struct HugeCase
{
    std::string name;
    std::string mark;
    std::string (*make)();
    std::vector<Refusal> refusals; ///< none: the token is accepted as if nothing was inserted
};

std::ostream& operator<<(std::ostream& out, const HugeCase& hugeCase)
{
    return out << hugeCase.name;
}

std::string Repeat(const std::string& text, std::size_t count)
{
    std::string result;
    result.reserve(text.size() * count);
    for (std::size_t i = 0; i < count; ++i) {
        result += text;
    }
    return result;
}

std::string Numbered(const std::string& before, const std::string& after, std::size_t count)
{
    std::string result;
    for (std::size_t i = 0; i < count; ++i) {
        result.append(before).append(std::to_string(i)).append(after);
    }
    return result;
}

std::string Nested(std::size_t depth)
{
    return Repeat("<a>", depth) + Repeat("</a>", depth);
}

/** Key information may hold elements of any namespace but none. */
std::string InKeyInfo(const std::string& content)
{
    return "<ds:KeyInfo xmlns=\"urn:other\">" + content + "</ds:KeyInfo>";
}

const char BeforeSubject[] = "<saml:Subject>";
const char SignatureEnd[] = "</ds:Signature>";
const char SignedInfoEnd[] = "</ds:SignedInfo>";
const char TransformsEnd[] = "</ds:Transforms>";
const char InIssuerTag[] = " Format=\"urn:oasis:names:tc:SAML:2.0:nameid-format:entity\"";
const char InGivenName[] = "Ada</saml:AttributeValue>";

// The signature covers nothing of KeyInfo, and nothing in it but certificates is looked at. So
// the limits can be touched there from both sides with a genuine signature. The elements above
// are Assertion, Signature and KeyInfo.
const std::vector<HugeCase> HugeCases{
    {"DepthAtLimit", SignatureEnd, [] { return InKeyInfo(Nested(125)); }, {}},
    {"DepthOverLimit", SignatureEnd, [] { return InKeyInfo(Nested(126)); }, OverLimit},
    {"AttributesAtLimit",
     SignatureEnd,
     [] { return InKeyInfo("<a" + Numbered(" a", "=''", 256) + "/>"); },
     {}},
    {"AttributesOverLimit",
     SignatureEnd,
     [] { return InKeyInfo("<a" + Numbered(" a", "=''", 257) + "/>"); },
     OverLimit},
    {"NamespacesAtLimit",
     SignatureEnd,
     [] { return InKeyInfo("<a" + Numbered(" xmlns:a", "='urn:a'", 64) + "/>"); },
     {}},
    {"NamespacesOverLimit",
     SignatureEnd,
     [] { return InKeyInfo("<a" + Numbered(" xmlns:a", "='urn:a'", 65) + "/>"); },
     OverLimit},
    {"NamespacesInScopeOverLimit",
     SignatureEnd,
     [] {
         std::string open;
         for (int i = 0; i < 5; ++i) {
             const std::string prefix = " xmlns:p" + std::to_string(i) + "x";
             open += "<a" + Numbered(prefix, "='urn:a'", 60) + ">";
         }
         return InKeyInfo(open + Repeat("</a>", 5));
     },
     OverLimit},

    {"TwoHundredThousandLevels", BeforeSubject, [] { return Nested(200 * Thousand); }, OverLimit},
    {"TwoHundredThousandLevelsInSignature",
     SignatureEnd,
     [] { return InKeyInfo(Nested(200 * Thousand)); },
     OverLimit},
    {"TwoHundredThousandUnclosedLevels",
     BeforeSubject,
     [] { return Repeat("<a>", 200 * Thousand); },
     OverLimit},
    {"TwoHundredThousandAttributes",
     InIssuerTag,
     [] { return Numbered(" a", "=\"\"", 200 * Thousand); },
     OverLimit},
    {"TwoHundredThousandEqualAttributes",
     InIssuerTag,
     [] { return Repeat(" a=\"\"", 200 * Thousand); },
     OverLimit},
    {"TwoHundredThousandPrefixedAttributes",
     InIssuerTag,
     [] { return " xmlns:p=\"urn:p\"" + Numbered(" p:a", "=\"\"", 200 * Thousand); },
     OverLimit},
    {"HundredThousandNamespaces",
     InIssuerTag,
     [] { return Numbered(" xmlns:a", "=\"urn:a\"", 100 * Thousand); },
     OverLimit},
    {"HundredThousandNamespacesOnNestedElements",
     BeforeSubject,
     [] { return Numbered("<a xmlns:a", "=\"urn:a\">", 100 * Thousand); },
     OverLimit},
    {"ThirtyMegabytesOfText",
     InGivenName,
     [] { return std::string(30 * Million, 'a'); },
     OverLimit},
    {"ThirtyMegabytesOfBlanks",
     BeforeSubject,
     [] { return std::string(30 * Million, ' '); },
     OverLimit},
    {"ThirtyMegabytesInAnAttribute",
     InIssuerTag,
     [] { return " a=\"" + std::string(30 * Million, 'a') + "\""; },
     OverLimit},
    {"ThirtyMegabytesInAComment",
     BeforeSubject,
     [] { return "<!--" + std::string(30 * Million, 'a') + "-->"; },
     OverLimit},

    {"MillionComments", BeforeSubject, [] { return Repeat("<!---->", Million); }, {}},
    {"MillionLargerComments",
     BeforeSubject,
     [] { return Repeat("<!-- larger -->", Million); },
     OverLimit},
    {"MillionCommentsInSignedInfo", SignedInfoEnd, [] { return Repeat("<!---->", Million); }, {}},
    {"SevenMegabytesInAComment",
     BeforeSubject,
     [] { return "<!--" + std::string(7 * Million, 'a') + "-->"; },
     {}},
    {"SevenMegabytesOfText",
     InGivenName,
     [] { return std::string(7 * Million, 'a'); },
     BadSignature},
    {"SevenMegabytesInAnAttribute",
     InIssuerTag,
     [] { return " a=\"" + std::string(7 * Million, 'a') + "\""; },
     {{ParseError, "Unexpected attributes on element 'Issuer'", "", ""}}},
    {"SevenMegabytesOfAnElementName",
     BeforeSubject,
     [] { return "<" + std::string(7 * Million, 'a') + "/>"; },
     {NoSubject.front(), {XmlError, "", "", ""}}},
    {"MillionCharacterReferences",
     InGivenName,
     [] { return Repeat("&#65;", Million); },
     BadSignature},
    {"HalfMillionSections",
     InGivenName,
     [] { return Repeat("<![CDATA[a]]>", Million / 2); },
     BadSignature},
    {"MillionInstructions", BeforeSubject, [] { return Repeat("<?a ?>", Million); }, NoSubject},

    {"TenThousandReferences",
     SignedInfoEnd,
     [] { return Repeat("<ds:Reference URI=\"\"></ds:Reference>", 10 * Thousand); },
     {{ParseError,
       "Signature syntax error: Expected element 'DigestMethod' in 'Reference', found nothing",
       "",
       ""}}},
    {"TenThousandWholeReferences",
     SignedInfoEnd,
     [] {
         return Repeat(
             "<ds:Reference URI=\"\"><ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/"
             "2000/09/xmldsig#enveloped-signature\"/></ds:Transforms><ds:DigestMethod Algorithm="
             "\"http://www.w3.org/2001/04/xmlenc#sha256\"/><ds:DigestValue>"
             "AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA=</ds:DigestValue></ds:Reference>",
             10 * Thousand);
     },
     {{SignatureError,
       "Signature verification error. The signature has 10001 references; 1 to 8 are accepted",
       "",
       ""}}},
    {"HundredThousandTransforms",
     TransformsEnd,
     [] {
         return Repeat(
             "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
             100 * Thousand);
     },
     ThirdTransform},
    {"HundredThousandListedPrefixes",
     TransformsEnd,
     [] {
         return "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\">"
                "<ec:InclusiveNamespaces xmlns:ec=\"http://www.w3.org/2001/10/xml-exc-c14n#\" "
                "PrefixList=\""
                + Numbered(" p", "", 100 * Thousand) + "\"/></ds:Transform>";
     },
     ThirdTransform},
    {"SevenMegabytesOfSignatureValue",
     "</ds:SignatureValue>",
     [] { return std::string(7 * Million, 'A'); },
     BadSignature},
    {"SevenMegabytesOfBlanksInSignatureValue",
     "</ds:SignatureValue>",
     [] { return std::string(7 * Million, '\n'); },
     {}},
    {"SevenMegabytesOfDigestValue",
     "</ds:DigestValue>",
     [] { return std::string(7 * Million, 'A'); },
     BadSignature},
    {"KeyInfoOfSevenMegabytes",
     SignatureEnd,
     [] { return InKeyInfo("<ds:KeyName>" + std::string(7 * Million, 'a') + "</ds:KeyName>"); },
     {}},
    {"KeyInfoOfAMillionElements",
     SignatureEnd,
     [] { return InKeyInfo(Repeat("<a/>", Million)); },
     {}},
    {"KeyInfoOfOneHugeCertificate",
     SignatureEnd,
     [] {
         return InKeyInfo(
             "<ds:X509Data><ds:X509Certificate>" + std::string(4 * Million, 'A')
             + "</ds:X509Certificate></ds:X509Data>");
     },
     BadSignature},
    {"KeyInfoOfHundredThousandCertificates",
     SignatureEnd,
     [] {
         return InKeyInfo(
             "<ds:X509Data>"
             + Repeat("<ds:X509Certificate>AAAA</ds:X509Certificate>", 100 * Thousand)
             + "</ds:X509Data>");
     },
     BadSignature},
};

class HugeToken : public testing::TestWithParam<HugeCase>
{};

std::string NameOf(const testing::TestParamInfo<HugeCase>& info)
{
    return info.param.name;
}

} // namespace

TEST_P(HugeToken, IsJudgedWithinItsLimits)
{
    const TokenCase& line = GetTokenCase("accepted/bearer.xml");
    const std::string xml =
        ReplaceOnce(ReadToken(line), GetParam().mark, GetParam().make() + GetParam().mark);
    const Verdict verdict = Judge(xml, GetConditions(line));
    if (GetParam().refusals.empty()) {
        ASSERT_TRUE(verdict.IsAccepted()) << Describe(verdict);
        EXPECT_EQ(*verdict.facts, line.facts);
    } else {
        EXPECT_TRUE(IsAmong(verdict, GetParam().refusals))
            << "found:    " << Describe(verdict).substr(0, 1000)
            << "\nexpected: " << Describe(GetParam().refusals);
    }
}

INSTANTIATE_TEST_SUITE_P(Of, HugeToken, testing::ValuesIn(HugeCases), NameOf);

// What is canonicalized before anything is known to be genuine must cost no more than it is long.
// Each case comes at two sizes of which the larger would show a cost that grows with the square.
class HugeCanonicalForm : public testing::TestWithParam<std::size_t>
{
protected:
    /** Judges a token whose SignedInfo is canonicalized with this prefix list and its content. */
    static Verdict JudgeList(const std::string& prefixes, const std::string& content)
    {
        const TokenCase& line = GetTokenCase("accepted/prefix-list-xs.xml");
        const std::string xml = ReplaceOnce(
            ReadToken(line),
            "xs\"/></ds:CanonicalizationMethod>",
            prefixes + "\">" + content + "</ec:InclusiveNamespaces></ds:CanonicalizationMethod>");
        return Judge(xml, GetConditions(line));
    }

    static std::string Siblings() { return Numbered("<a xmlns:p", "=\"urn:x\"/>", GetParam()); }
};

TEST_P(HugeCanonicalForm, OfListedPrefixesAndElements)
{
    const Verdict verdict =
        JudgeList(Numbered(" p", "", GetParam()), Repeat("<a/><b/>", GetParam() / 2));
    EXPECT_TRUE(IsAmong(verdict, NoList)) << Describe(verdict).substr(0, 1000);
}

TEST_P(HugeCanonicalForm, OfListedPrefixes)
{
    const Verdict verdict = JudgeList(Numbered(" p", "", GetParam()), "");
    EXPECT_TRUE(IsAmong(verdict, LongList)) << Describe(verdict).substr(0, 1000);
}

TEST_P(HugeCanonicalForm, OfDeclaringSiblings)
{
    const Verdict verdict = JudgeList("xs", Siblings());
    EXPECT_TRUE(IsAmong(verdict, NoList)) << Describe(verdict).substr(0, 1000);
}

TEST_P(HugeCanonicalForm, OfAnAssertionWithDeclaringSiblings)
{
    const TokenCase& line = GetTokenCase("accepted/bearer.xml");
    const std::string xml = ReplaceOnce(ReadToken(line), BeforeSubject, Siblings() + BeforeSubject);
    const Verdict verdict = JudgeInDom(xml, GetConditions(line));
    EXPECT_TRUE(IsAmong(verdict, NoSubject)) << Describe(verdict).substr(0, 1000);
}

INSTANTIATE_TEST_SUITE_P(Of, HugeCanonicalForm, testing::Values(100 * Thousand, 200 * Thousand));

TEST(HugeDocument, IsAcceptedUpToTheLimit)
{
    const TokenCase& line = GetTokenCase("accepted/bearer.xml");
    const std::string token = ReadToken(line);
    const std::string xml = token + std::string(MaxBytes - token.size(), ' ');
    const Verdict verdict = Judge(xml, GetConditions(line));
    ASSERT_TRUE(verdict.IsAccepted()) << Describe(verdict);
    EXPECT_EQ(*verdict.facts, line.facts);
}

TEST(HugeDocument, IsRefusedAByteOverTheLimit)
{
    const TokenCase& line = GetTokenCase("accepted/bearer.xml");
    const std::string token = ReadToken(line);
    const std::string xml = token + std::string(MaxBytes - token.size() + 1, ' ');
    EXPECT_EQ(Judge(xml, GetConditions(line)).className, XmlError);
}

} // namespace HostileTests
