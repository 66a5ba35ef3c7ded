#pragma once

#include "Trust.h"

#include "ssoClient/SamlToken.h"

#include <string>
#include <vector>

/** Something that a person wants to know of a token. */
struct ExplainedFact
{
    std::string name;
    std::vector<std::string> values;
    bool isChain = false; ///< whether each value follows from the one before
};

/** How long a validity still lasts; one that does not hold now was let pass by the tolerance. */
std::string DescribeValidity(
    const Quillon::System::DateTime& startDate, const Quillon::System::DateTime& endDate);

/** A certificate by its subject and fingerprint. */
std::string DescribeCertificate(const Quillon::Crypto::Certificate& certificate);

/** How long the token is valid, who signed and issued it, and so on, as `Explain` has it. */
std::vector<ExplainedFact> ExplainFacts(
    const SsoClient::SamlToken& token, const Quillon::Crypto::Certificate* signer);

/**
 * Lines for a person about a verified token: how long it is valid, who signed and issued it, what
 * it is bound to, for whom it is, and who may act for its subject.
 *
 * @param signer  the certificate that signed it; may be null if that is not known.
 */
std::string Explain(const SsoClient::SamlToken& token, const Quillon::Crypto::Certificate* signer);
