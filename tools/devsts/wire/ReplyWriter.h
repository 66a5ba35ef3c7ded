#pragma once

#include "devsts/wire/Request.h"

#include <string>

namespace DevSts {

/** The answer to Issue: a collection with one response. [WST13 4.3] */
std::string WriteIssueReply(const xmlDoc* assertion, const Interval& lifetime);

/** The answer to a leg that is not the last: a single response. [WST13 8.2] */
std::string WriteLegReply(const NegotiationLeg& leg);

/** The answer to the last leg: as to Issue, with the context and, unless empty, a last leg. */
std::string WriteNegotiatedReply(
    const xmlDoc* assertion, const Interval& lifetime, const NegotiationLeg& leg);

/** The answer to Renew: a single response, without a collection. [WST13 5] */
std::string WriteRenewReply(const xmlDoc* assertion, const Interval& lifetime);

/** The answer to Validate. [WST13 7] */
std::string WriteStatusReply(bool isValid, const std::string& reason);

} // namespace DevSts
