#include "ssoClient/assertion/MappedSamlToken.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/reading.h"

#include <utility>

namespace SsoClient {

using Quillon::Ref;
using Quillon::Crypto::Certificate;

namespace {

SamlToken::ConfirmationType GetMethod(const AssertionConfirmation& confirmation)
{
    if (confirmation.method == BearerConfirmation) {
        return SamlToken::CONFIRM_BEARER;
    }
    if (confirmation.method == HolderOfKeyConfirmation) {
        return SamlToken::CONFIRM_HOLDER_OF_KEY;
    }
    throw ParseException(
        "A token cannot be made of an assertion whose confirmation method is "
        + GeneralReader::Quote(confirmation.method));
}

/** A token has room for one certificate, and a bearer token for none. */
Ref<const Certificate> GetCertificate(const AssertionConfirmation& confirmation)
{
    if (GetMethod(confirmation) == SamlToken::CONFIRM_BEARER) {
        return {};
    }
    if (confirmation.keys.size() != 1 || confirmation.keys.front().certificate == nullptr) {
        throw ParseException(
            "A token cannot be made of a holder-of-key assertion with "
            + std::to_string(confirmation.keys.size())
            + " keys, expected one that is given by a certificate");
    }
    return confirmation.keys.front().certificate;
}

template <class Restriction>
bool AllowsSome(const boost::optional<Restriction>& restriction)
{
    return restriction && restriction->count && *restriction->count != 0;
}

} // namespace

MappedSamlToken::MappedSamlToken(
    boost::shared_ptr<const VerifiedAssertion> assertion, MappedFacts facts)
    : _assertion(std::move(assertion))
    , _facts(std::move(facts))
    , _method(GetMethod(_assertion->GetConfirmation()))
    , _certificate(GetCertificate(_assertion->GetConfirmation()))
{}

bool MappedSamlToken::IsRenewable() const
{
    return AllowsSome(_assertion->GetFacts().conditions.renewRestriction);
}

bool MappedSamlToken::IsDelegable() const
{
    return AllowsSome(_assertion->GetFacts().conditions.proxyRestriction);
}

} // namespace SsoClient
