#include "GeneralReading.h"

#include "OneLine.h"
#include "Terminal.h"

#include "ssoClient/Assertion.h"

namespace {

std::string DescribeSubject(const SsoClient::VerifiedAssertion& assertion)
{
    const auto& subject = assertion.GetFacts().subject;
    if (!subject) {
        return "it has no NameID";
    }
    return subject->format
               ? "the Format of its NameID is " + Shorten(*subject->format, MaxShownBytes)
               : "its NameID has no Format";
}

} // namespace

void NoteGeneralReading(
    const std::string& token, const CertificateList& trusted, long long clockToleranceSec)
{
    SsoClient::AssertionRules rules;
    rules.clockToleranceSec = clockToleranceSec;
    try {
        const auto assertion = SsoClient::VerifyAssertion(token, trusted, rules);
        Notice("the token would be read with --general; " + DescribeSubject(*assertion));
    } catch (const Quillon::Exception&) {
        return; // The refusal that is reported is the whole story.
    }
}
