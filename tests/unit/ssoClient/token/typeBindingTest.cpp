#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/wire/wireNames.h"
#include "unit/ssoClient/token/TokenText.h"

#include <gtest/gtest.h>

// Exclusive canonicalization renders a declaration only where an element's or attribute's name
// uses its prefix, or where a prefix list names it [EXC-C14N 3, 4]. What a prefix in the value of
// an `xsi:type` is bound to is then not signed: whoever passes the token on can bind it anew.
using namespace TokenText;
namespace Wire = SsoClient::Wire;

namespace {

/** Judges tokens signed with a condition's type behind the prefix `t`, which the signature omits.
 */
class TypeBinding : public testing::Test
{
protected:
    /** The signed text without the declaration, which is its canonical form. */
    static std::string Sign(const std::string& assertion) { return StsKey().Sign(assertion); }

    static std::string Bind(const std::string& signedText, const std::string& namespaceUri)
    {
        return Replace(
            signedText, " xsi:type=\"t:", " xmlns:t=\"" + namespaceUri + "\" xsi:type=\"t:");
    }

    static std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> Trusted()
    {
        return {StsKey().GetCertificate()};
    }

    FixedClock _clock; // NOLINT(readability-identifier-naming): a fixture's member is protected
};

std::string Renewable()
{
    return InsertBefore(
        Bearer(),
        EndOfConditions,
        "<saml:Condition Count=\"1\" xsi:type=\"t:RenewRestrictionType\"></saml:Condition>");
}

std::string HolderOfKeyByType()
{
    return Replace(
        HolderOfKey(StsKey().GetCertificateBase64()), "xsi:type=\"saml:", "xsi:type=\"t:");
}

std::string Delegated()
{
    const std::string restriction =
        Replace(DelegationRestriction({"a@d"}), "xsi:type=\"del:", "xsi:type=\"t:");
    return InsertBefore(
        InsertBefore(Bearer(), EndOfConditions, restriction),
        "<saml:SubjectConfirmationData ",
        NameId("a@d"));
}

} // namespace

TEST_F(TypeBinding, OfTheRenewRestrictionIsNotSigned)
{
    const std::string text = Sign(Renewable());
    EXPECT_EQ(
        "ParseException: Unknown or duplicate restriction node under Conditions: Condition",
        Judge(Bind(text, "urn:other"), Trusted()));
    EXPECT_TRUE(
        SsoClient::CreateSamlToken(Bind(text, Wire::RsaNamespace), Trusted())->IsRenewable());
}

TEST_F(TypeBinding, OfTheDelegationRestrictionIsNotSigned)
{
    const std::string text = Sign(Delegated());
    EXPECT_EQ(
        "ParseException: Unknown or duplicate restriction node under Conditions: Condition",
        Judge(Bind(text, "urn:other"), Trusted()));
    EXPECT_EQ("accepted", Judge(Bind(text, Wire::DelegationNamespace), Trusted()));
}

TEST_F(TypeBinding, OfTheConfirmationDataIsNotSigned)
{
    const std::string text = Sign(HolderOfKeyByType());
    EXPECT_EQ(
        "ParseException: Invalid SubjectConfirmationData type: "
        "'{urn:other}KeyInfoConfirmationDataType'",
        Judge(Bind(text, "urn:other"), Trusted()));
    EXPECT_EQ("accepted", Judge(Bind(text, Wire::SamlNamespace), Trusted()));
}

TEST_F(TypeBinding, IsSignedWhereThePrefixListNamesIt)
{
    // The signature's list has "rsa".
    const std::string text = Sign(InsertBefore(
        Bearer(),
        EndOfConditions,
        "<saml:Condition Count=\"1\" xsi:type=\"rsa:RenewRestrictionType\"></saml:Condition>"));
    EXPECT_TRUE(SsoClient::CreateSamlToken(text, Trusted())->IsRenewable());
    const std::string rebound =
        Replace(text, " xsi:type=\"rsa:", " xmlns:rsa=\"urn:other\" xsi:type=\"rsa:");
    EXPECT_NE("accepted", Judge(rebound, Trusted()));
    // The other way round, the type is an accepted one and the signature tells.
    const std::string foreign = Replace(
        Bearer(), std::string("xmlns:rsa=\"") + Wire::RsaNamespace, "xmlns:rsa=\"urn:other");
    const std::string forged = StsKey().Sign(InsertBefore(
        foreign,
        EndOfConditions,
        "<saml:Condition Count=\"1\" xsi:type=\"rsa:RenewRestrictionType\"></saml:Condition>"));
    EXPECT_EQ(
        "InvalidSignatureException: Failed to verify signature: token might have been tampered "
        "with.",
        Judge(
            Replace(
                forged, "xmlns:rsa=\"urn:other", std::string("xmlns:rsa=\"") + Wire::RsaNamespace),
            Trusted()));
}
