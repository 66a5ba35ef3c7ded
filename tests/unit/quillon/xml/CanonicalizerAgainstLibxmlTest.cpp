#include "RandomDocument.h"
#include "XmlSupport.h"
#include "support/Libxml.h"

#include <gtest/gtest.h>

// The canonicalizer must agree octet for octet with an independent one on whatever it is given.
namespace Quillon::Xml {

namespace {

constexpr unsigned Documents = 10000;

const std::vector<std::vector<std::string>> PrefixLists{
    {}, {"a", "zz"}, {"#default"}, {"#default", "b", "ns-1", "unused"}};

class CanonicalizeAgainstLibxml : public testing::TestWithParam<bool>
{
protected:
    void Compare(unsigned seed)
    {
        const std::string text = RandomDocument(seed).Make();
        const DocOwner doc = ParseWithLibxml(text);
        ASSERT_NE(doc, nullptr) << text;
        const Ref<Document> ours = ParseText(text);
        std::vector<xmlNode*> theirElements;
        std::vector<const ElementNode*> ourElements;
        CollectElements(doc->children, theirElements);
        CollectElements(ours->GetFirstChild(), ourElements);
        ASSERT_EQ(theirElements.size(), ourElements.size()) << text;

        const char* identifier = GetParam() ? Security::ExclusiveC14n : Security::InclusiveC14n;
        const auto& prefixes = PrefixLists[GetParam() ? seed % PrefixLists.size() : 0];
        EXPECT_EQ(
            CanonicalizeWithLibxml(doc.get(), nullptr, GetParam(), prefixes),
            CanonicalizeToText(identifier, ours.get(), prefixes))
            << text;
        const std::size_t nested = seed % ourElements.size();
        EXPECT_EQ(
            CanonicalizeWithLibxml(doc.get(), theirElements[nested], GetParam(), prefixes),
            CanonicalizeToText(identifier, ourElements[nested], prefixes))
            << text << "\nelement " << nested;
    }
};

TEST_P(CanonicalizeAgainstLibxml, AgreesOnGeneratedDocuments)
{
    for (unsigned seed = 0; seed < Documents && !HasFailure(); ++seed) {
        Compare(seed);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Form, CanonicalizeAgainstLibxml, testing::Bool(), [](const testing::TestParamInfo<bool>& form) {
        return form.param ? "Exclusive" : "Inclusive";
    });

} // namespace

} // namespace Quillon::Xml
