#pragma once

#include "quillon/Exceptions.h"
#include "ssoClient/SamlToken.h"
#include "ssoClientRuntime/RefreshMachine.h"
#include "ssoClientRuntime/RuntimeEnvironment.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <functional>
#include <memory>

/** How tokens are got, what became of it, and what is read from them. */
namespace SsoClient {

/** What an attempt gave: a token, or else why there is none. */
struct Outcome
{
    boost::shared_ptr<const SamlToken> token;
    std::shared_ptr<const Quillon::Exception> failure;
};

/** A copy of an exception with the dynamic type that it has. */
std::shared_ptr<const Quillon::Exception> Keep(const Quillon::Exception& failure);

/** Calls that and catches what it throws; null is a failure too. */
Outcome Try(const std::function<boost::shared_ptr<const SamlToken>()>& acquire);

/**
 * Whether a failure may be gone the next time. What concerns the connection or its other end may,
 * and so may what another source waits for; a fault, a bad token or a mistake will be the same.
 */
FailureKind Classify(const Quillon::Exception& failure);

/**
 * IssueInstant [SAML-CORE 2.3.3], or NotBefore if the token's text has none that can be used, and
 * NotOnOrAfter.
 */
Validity ReadValidity(const SamlToken& token);

/** Whether a token may be renewed by the holder of that certificate, which may be null. */
bool IsRenewableBy(const SamlToken& token, const Quillon::Crypto::Certificate* identity);

/** What a token that came with too little validity left fails with. */
std::shared_ptr<const Quillon::Exception> MakeTooEarly(const Validity& validity, const Moment& now);

/** Both clocks. */
Moment ReadClocks(const RuntimeEnvironment& environment);

/** Class and text, no longer than what a log line should have. */
std::string DescribeFailure(const Quillon::Exception& failure);

} // namespace SsoClient
