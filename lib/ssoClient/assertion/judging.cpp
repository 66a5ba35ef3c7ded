#include "ssoClient/assertion/judging.h"

#include "quillon/system/Clock.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/reading.h"

#include <algorithm>

namespace SsoClient::GeneralReader {

using Quillon::System::DateTime;
using OptionalDate = boost::optional<DateTime>;

namespace {

/** More seconds than the calendar has: beyond it, a span of time changes nothing any more. */
constexpr long long MaxSpanSec = 400'000'000'000;

/** How long a message may grow before no further confirmation is described. */
constexpr std::size_t MaxFaultsLength = 1000;

long long ToMicros(long long seconds) noexcept
{
    return std::clamp(seconds, -MaxSpanSec, MaxSpanSec) * 1'000'000;
}

/** The one reading of the clock that everything is compared with. */
class Moment
{
public:
    explicit Moment(const AssertionRules& rules)
        : _now(Quillon::System::GetUtcDateTime().GetUtcTime())
        , _tolerance(ToMicros(rules.clockToleranceSec))
    {}

    bool IsBefore(const DateTime& start) const noexcept
    {
        return start.GetUtcTime() - _tolerance > _now;
    }

    // [SAML-CORE 2.5.1.2]: the end itself does not belong to the validity.
    bool IsAtOrAfter(const DateTime& end) const noexcept
    {
        return _now - _tolerance >= end.GetUtcTime();
    }

    bool IsOlder(const DateTime& instant, long long ageSec) const noexcept
    {
        return _now - _tolerance - instant.GetUtcTime() > ToMicros(ageSec);
    }

private:
    long long _now;
    long long _tolerance;
};

void TakeLater(OptionalDate& start, const OptionalDate& other)
{
    if (other && (!start || *start < *other)) {
        start = other;
    }
}

void TakeEarlier(OptionalDate& end, const OptionalDate& other)
{
    if (other && (!end || *other < *end)) {
        end = other;
    }
}

std::string Describe(const boost::optional<std::string>& value)
{
    return value ? Quote(*value) : "none";
}

/** Why the rules do not take a confirmation; empty if they do. Times are looked at later. */
std::string FindFault(const AssertionConfirmation& confirmation, const AssertionRules& rules)
{
    if (rules.confirmationMethods.count(confirmation.method) == 0) {
        return "its method " + Quote(confirmation.method) + " is not accepted";
    }
    if (rules.recipient && confirmation.recipient != rules.recipient) {
        return "its Recipient is " + Describe(confirmation.recipient) + ", expected "
               + Quote(*rules.recipient);
    }
    if (rules.inResponseTo && confirmation.inResponseTo != rules.inResponseTo) {
        return "its InResponseTo is " + Describe(confirmation.inResponseTo) + ", expected "
               + Quote(*rules.inResponseTo);
    }
    return {};
}

/**
 * [SAML-CORE 2.4.1.1]: one that is satisfied is enough. Where several could be, it is not known
 * which one the presenter means, so the rules must leave one.
 */
std::size_t ChooseConfirmation(const AssertionFacts& facts, const AssertionRules& rules)
{
    std::vector<std::size_t> fitting;
    std::string faults;
    for (std::size_t i = 0; i < facts.confirmations.size(); ++i) {
        const std::string fault = FindFault(facts.confirmations[i], rules);
        if (fault.empty()) {
            fitting.push_back(i);
        } else if (faults.size() < MaxFaultsLength) {
            faults += (faults.empty() ? "" : "; ") + fault;
        }
    }
    if (fitting.empty()) {
        throw ParseException(
            "No subject confirmation is acceptable: "
            + (faults.empty() ? "there is none" : faults));
    }
    if (fitting.size() > 1) {
        throw ParseException(
            std::to_string(fitting.size())
            + " subject confirmations are acceptable; the rules must leave one, by method, "
              "recipient or InResponseTo");
    }
    return fitting.front();
}

void CheckAudience(const AssertionConditions& conditions, const AssertionRules& rules)
{
    if (!rules.audience) {
        return;
    }
    if (conditions.audienceRestrictions.empty()) {
        throw ParseException("The assertion names no audience, expected " + Quote(*rules.audience));
    }
    for (const AssertionAudience& restriction : conditions.audienceRestrictions) {
        if (restriction.count(*rules.audience) == 0) {
            throw ParseException(
                "An audience restriction names " + Quote(*restriction.begin())
                + (restriction.size() > 1 ? " and others" : "") + ", not "
                + Quote(*rules.audience));
        }
    }
}

void CheckAge(const AssertionFacts& facts, const AssertionRules& rules, const Moment& moment)
{
    if (moment.IsBefore(facts.issueInstant)) {
        throw ParseException(
            "The assertion is issued in the future: " + facts.issueInstant.ToString());
    }
    if (rules.maximumAgeSec && moment.IsOlder(facts.issueInstant, *rules.maximumAgeSec)) {
        throw ParseException(
            "The assertion was issued at " + facts.issueInstant.ToString() + ", more than "
            + std::to_string(*rules.maximumAgeSec) + " seconds ago");
    }
}

/** The end of the assertion, or that of a session where it comes first. */
DateTime GetEnd(const AssertionFacts& facts, const AssertionConfirmation& confirmation)
{
    OptionalDate end = facts.conditions.notOnOrAfter;
    TakeEarlier(end, confirmation.notOnOrAfter);
    if (!end) {
        throw ParseException(
            "The assertion has no end: neither its conditions nor its confirmation have "
            "NotOnOrAfter");
    }
    for (const AssertionAuthentication& authentication : facts.authentications) {
        TakeEarlier(end, authentication.sessionNotOnOrAfter);
    }
    return *end;
}

DateTime GetStart(const AssertionFacts& facts, const AssertionConfirmation& confirmation)
{
    OptionalDate start = facts.conditions.notBefore;
    TakeLater(start, confirmation.notBefore);
    return start ? *start : facts.issueInstant;
}

void CheckValidity(const Judgement& judgement, const Moment& moment)
{
    if (!(judgement.startDate < judgement.endDate)) {
        throw ParseException(
            "The assertion is never valid: it starts at " + judgement.startDate.ToString()
            + " and ends at " + judgement.endDate.ToString());
    }
    if (moment.IsBefore(judgement.startDate)) {
        throw ParseException("The assertion is not valid before " + judgement.startDate.ToString());
    }
    if (moment.IsAtOrAfter(judgement.endDate)) {
        throw ParseException("The assertion has expired at " + judgement.endDate.ToString());
    }
}

} // namespace

Judgement Judge(const AssertionFacts& facts, const AssertionRules& rules)
{
    const Moment moment(rules);
    CheckAge(facts, rules, moment);
    CheckAudience(facts.conditions, rules);
    Judgement judgement;
    judgement.confirmation = ChooseConfirmation(facts, rules);
    const AssertionConfirmation& confirmation = facts.confirmations[judgement.confirmation];
    judgement.startDate = GetStart(facts, confirmation);
    judgement.endDate = GetEnd(facts, confirmation);
    CheckValidity(judgement, moment);
    return judgement;
}

} // namespace SsoClient::GeneralReader
