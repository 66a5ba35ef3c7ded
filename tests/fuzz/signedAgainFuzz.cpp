#include "devsts/security/Certificates.h"
#include "devsts/security/SignatureReader.h"
#include "devsts/security/Signing.h"
#include "devsts/security/Verifying.h"
#include "devsts/wire/Names.h"
#include "devsts/wire/Xml.h"
#include "fuzz/fuzzing.h"
#include "fuzz/xmlMutation.h"
#include "hostile/TokenTable.h"
#include "quillon/system/Clock.h"
#include "support/FixedClock.h"
#include "support/TestData.h"
#include "unit/ssoClient/assertion/AssertionTable.h"

#include <libxml/xpath.h>
#include <libxml/xpathInternals.h>

#include <functional>
#include <regex>

// Behind the signature: whatever an assertion says, it is signed, by xmlsec1, and then judged. What
// is accepted is read as libxml2 reads it, and xmlsec1 accepts it too. Then it is changed without
// the key: if it is still accepted, it says the same, and xmlsec1 accepts it still.
namespace {

using namespace HostileTests;

/** A wrapped document is as good as any, so a few of each are looked at. */
constexpr unsigned ForgeriesOfEach = 3;

const Conditions& GetOwnConditions()
{
    static const Conditions conditions = GetConditions(GetTokenCase("accepted/bearer.xml"));
    return conditions;
}

DevSts::XmlDocument Parse(const std::string& text)
{
    try {
        return DevSts::ParseXml(text);
    } catch (const std::runtime_error&) {
        return nullptr;
    }
}

xmlNode* FindSignature(xmlNode* assertion)
{
    for (xmlNode* child = assertion->children; child != nullptr; child = child->next) {
        if (DevSts::IsElement(child, {DevSts::Names::Ds, "Signature"})) {
            return child;
        }
    }
    return nullptr;
}

/** Without the signatures that it has, and with a new one; empty if it is none to be signed. */
std::string SignAgain(const std::string& text, const DevSts::Signer& signer)
{
    const DevSts::XmlDocument document = Parse(text);
    if (document == nullptr) {
        return "";
    }
    xmlNode* const root = xmlDocGetRootElement(document.get());
    while (xmlNode* const signature = FindSignature(root)) {
        xmlUnlinkNode(signature);
        xmlFreeNode(signature);
    }
    try {
        signer.SignAssertion(document.get());
    } catch (const std::runtime_error&) {
        return "";
    }
    return DevSts::Serialize(document.get());
}

/** What xmlsec1 says of the signature of the root. */
bool IsVerifiedByXmlSec(const std::string& text)
{
    static const std::string der = DevSts::DerFromPem(ReadTestData("keys/sts-cert.pem"));
    const DevSts::XmlDocument document = Parse(text);
    Fuzzing::Require(document != nullptr, "accepted, but not by libxml2");
    xmlNode* const root = xmlDocGetRootElement(document.get());
    xmlNode* const signature = FindSignature(root);
    Fuzzing::Require(signature != nullptr, "accepted without a signature");
    const auto* const name = reinterpret_cast<const xmlChar*>("ID");
    const DevSts::XmlString id(xmlGetNoNsProp(root, name));
    xmlAddID(nullptr, document.get(), id.get(), xmlHasProp(root, name));
    return DevSts::VerifySignature(signature, der);
}

void RequireXmlSecToo(const std::string& text)
{
    Fuzzing::Require(IsVerifiedByXmlSec(text), "accepted, but not by xmlsec1:\n" + text);
}

/** See docs/threat-model.md: a comment may take the blanks off the ends of a value. */
std::string WithoutOuterBlanks(const std::string& facts)
{
    static const std::regex Blanks(R"re(( |\\(9|10|13);)*"( |\\(9|10|13);)*)re");
    return std::regex_replace(facts, Blanks, "\"");
}

std::string ReadWithLibxml(const std::string& text, const char* path)
{
    const DevSts::XmlDocument document = Parse(text);
    xmlXPathContext* const context = xmlXPathNewContext(document.get());
    xmlXPathRegisterNs(
        context,
        reinterpret_cast<const xmlChar*>("saml"),
        reinterpret_cast<const xmlChar*>(DevSts::Names::Saml));
    xmlXPathObject* const found =
        xmlXPathEvalExpression(reinterpret_cast<const xmlChar*>(path), context);
    xmlChar* const value = xmlXPathCastToString(found);
    const std::string result = reinterpret_cast<const char*>(value);
    xmlFree(value);
    xmlXPathFreeObject(found);
    xmlXPathFreeContext(context);
    return result;
}

/** What a reader makes of a text; empty if it refuses. */
using Reader = std::string (*)(const std::string&);

std::string ReadNarrowly(const std::string& text)
{
    return WithoutOuterBlanks(Judge(text, GetOwnConditions()).facts.value_or(""));
}

std::string ReadGenerally(const std::string& text)
{
    const FixedClock clock(Quillon::System::DateTimeFromUtc(GetOwnConditions().nowMicros, false));
    try {
        return AssertionTable::DescribeFacts(
            *SsoClient::VerifyAssertion(text, GetOwnConditions().trusted));
    } catch (const Quillon::Exception&) {
        return "";
    }
}

/** That there is one subject, and that the ID is what libxml2 reads. */
void RequireLibxmlsReading(const std::string& text, const std::string& facts)
{
    const std::string id = ReadWithLibxml(text, "/saml:Assertion/@ID");
    Fuzzing::Require(
        !id.empty() && facts.find("\"" + id + "\"") != std::string::npos, "another ID than " + id);
    Fuzzing::Require(
        ReadWithLibxml(text, "count(/saml:Assertion/saml:Subject)") == "1",
        "accepted without one subject");
}

void JudgeForgery(Reader read, const std::string& forged, const std::string& genuineFacts)
{
    const std::string facts = read(forged);
    if (facts.empty()) {
        return;
    }
    Fuzzing::Require(facts == genuineFacts, "other facts:\n" + facts + "\n" + forged);
    RequireXmlSecToo(forged);
}

void JudgeWith(Reader read, const std::string& text)
{
    const std::string facts = read(text);
    if (!facts.empty()) {
        RequireXmlSecToo(text);
        RequireLibxmlsReading(text, facts);
    }
    const auto first = static_cast<unsigned>(std::hash<std::string>()(text));
    for (unsigned count = 0; count < ForgeriesOfEach; ++count) {
        JudgeForgery(read, Fuzzing::MutateXml(text, first + count), facts);
    }
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static const std::string certificate = ReadTestData("keys/sts-cert.pem");
    static const DevSts::Signer signer(ReadTestData("keys/sts-key.pem"), certificate);
    static const DevSts::Signer impostor(ReadTestData("keys/foreign-key.pem"), certificate);
    const std::string input(Fuzzing::ToText(data, size));
    const std::string text = SignAgain(input, signer);
    if (text.empty()) {
        return 0;
    }
    const std::string foreign = SignAgain(input, impostor);
    for (const Reader read : {&ReadNarrowly, &ReadGenerally}) {
        JudgeWith(read, text);
        Fuzzing::Require(read(foreign).empty(), "signed by somebody else:\n" + foreign);
    }
    return 0;
}
