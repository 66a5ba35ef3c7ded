#include "ssoClient/Assertion.h"

#include "quillon/xml/Parser.h"
#include "ssoClient/Exceptions.h"
#include "unit/ssoClient/assertion/AssertionTable.h"

#include <gtest/gtest.h>

// What no signed document of the table can show.
namespace {

using namespace SsoClient;

std::string ReadAccepted(const std::string& name)
{
    return AssertionTable::Read(AssertionTable::GetRow("accepted/" + name + ".xml"));
}

std::string Replace(std::string text, const std::string& from, const std::string& to)
{
    const std::size_t position = text.find(from);
    return position == std::string::npos ? "nothing to replace"
                                         : text.replace(position, from.size(), to);
}

template <class Error>
std::string ErrorOf(const std::string& xml)
{
    try {
        AssertionTable::Verify(xml, AssertionRules());
        return "accepted";
    } catch (const Error& error) {
        return error.what();
    }
}

std::string CutSignature(const std::string& xml)
{
    const std::string end = "</ds:Signature>";
    const std::size_t start = xml.find("<ds:Signature");
    return std::string(xml).erase(start, xml.find(end) + end.size() - start);
}

constexpr char SamlNamespace[] = "urn:oasis:names:tc:SAML:2.0:assertion";

} // namespace

TEST(VerifyAssertion, RefusesOtherDocuments)
{
    EXPECT_EQ(
        ErrorOf<ParseException>("<a/>"),
        "Expected element 'Assertion' of SAML 2.0, found 'a' at 1,1");
    EXPECT_EQ(
        ErrorOf<ParseException>("\n <Assertion xmlns='urn:oasis:names:tc:SAML:1.0:assertion'/>"),
        "Expected element 'Assertion' of SAML 2.0, found 'Assertion' at 2,2");
    EXPECT_EQ(
        ErrorOf<ParseException>(
            std::string("<s:EncryptedAssertion xmlns:s='") + SamlNamespace + "'/>"),
        "The assertion is encrypted, and the rules have no key to decrypt it");
    EXPECT_NE(ErrorOf<Quillon::Xml::XMLParseException>("<a>"), "accepted");
}

TEST(VerifyAssertion, RefusesAnUnsignedAssertion)
{
    const std::string xml = CutSignature(ReadAccepted("no-statement"));
    EXPECT_EQ(ErrorOf<ParseException>(xml), "'saml:Assertion' at 1,1 is not signed");
}

TEST(VerifyAssertion, RefusesASignatureThatIsNotWellBuilt)
{
    const std::string xml =
        Replace(ReadAccepted("no-statement"), "<ds:SignatureValue>", "<ds:SignatureValue><!-- -->");
    EXPECT_EQ(
        ErrorOf<ParseException>(xml),
        "Signature syntax error: 'SignatureValue' must hold text and nothing else");
}

TEST(VerifyAssertion, JudgesTheSignatureBeforeAnythingElse)
{
    const std::string expired =
        Replace(ReadAccepted("no-statement"), "2024-05-06T13", "1999-05-06T13");
    EXPECT_EQ(
        ErrorOf<InvalidSignatureException>(expired),
        "Failed to verify signature: token might have been tampered with.");
}

TEST(VerifyAssertion, TrustsOnlyTheGivenCertificates)
{
    const std::string xml = ReadAccepted("no-statement");
    try {
        VerifyAssertion(xml, {});
        FAIL();
    } catch (const InvalidSignatureException& error) {
        EXPECT_STREQ(
            error.what(), "Signature verification error. There are no trusted certificates");
    }
    EXPECT_THROW(VerifyAssertion(xml, {nullptr}), Quillon::InvalidArgumentException);
}

TEST(VerifyAssertion, CutsWhatItRepeats)
{
    const std::string name(10'000, 'n');
    const std::string text = ErrorOf<ParseException>("<" + name + "/>");
    EXPECT_LT(text.size(), 300U);
    // Not in the middle of a character: 3 octets each, and 200 is no multiple of 3.
    std::string wide = "a";
    for (int i = 0; i < 100; ++i) {
        wide += "\xE4\xB8\xAD";
    }
    const std::string cut = ErrorOf<ParseException>("<" + wide + "/>");
    EXPECT_NE(cut.find("\xE4\xB8\xAD...'"), std::string::npos) << cut;
}

TEST(VerifiedAssertion, IsForWhomEveryRestrictionNames)
{
    const auto restricted =
        AssertionTable::Verify(AssertionTable::GetRow("accepted/two-restrictions.xml"));
    EXPECT_TRUE(restricted->IsFor("https://app.example.com/service"));
    EXPECT_FALSE(restricted->IsFor("https://a.example.com"));
    EXPECT_FALSE(restricted->IsFor("https://b.example.com"));
    EXPECT_TRUE(AssertionTable::Verify(AssertionTable::GetRow("accepted/no-conditions.xml"))
                    ->IsFor("anyone"));
}

TEST(VerifiedAssertion, FindsAttributesByTheirNames)
{
    const auto assertion =
        AssertionTable::Verify(AssertionTable::GetRow("accepted/group-values.xml"));
    ASSERT_NE(assertion->FindAttribute("user"), nullptr);
    EXPECT_EQ(assertion->FindAttribute("user")->values.front().text, "alice");
    EXPECT_EQ(assertion->FindAttribute("USER"), nullptr);
}

TEST(AssertionNameId, IsTheSameOnlyInAllItsParts)
{
    const AssertionNameId id{"v", std::string("f"), std::string("q"), boost::none, boost::none};
    EXPECT_EQ(id, AssertionNameId(id));
    for (boost::optional<std::string> AssertionNameId::*member :
         {&AssertionNameId::format,
          &AssertionNameId::nameQualifier,
          &AssertionNameId::spNameQualifier,
          &AssertionNameId::spProvidedId}) {
        AssertionNameId other = id;
        other.*member = std::string();
        EXPECT_NE(id, other);
    }
    AssertionNameId other = id;
    other.value = "V";
    EXPECT_NE(id, other);
}
