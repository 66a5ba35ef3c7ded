#pragma once

#include "ssoClient/Assertion.h"

/** Whether an assertion is valid now and keeps the rules. Every failure is a `ParseException`. */
namespace SsoClient::GeneralReader {

/** What judging an assertion finds. */
struct Judgement
{
    std::size_t confirmation = 0; ///< which of the confirmations is accepted
    Quillon::System::DateTime startDate;
    Quillon::System::DateTime endDate;
};

Judgement Judge(const AssertionFacts& facts, const AssertionRules& rules);

} // namespace SsoClient::GeneralReader
