#pragma once

#include "Finding.h"
#include "Trust.h"

#include "quillon/http/ExchangeFacts.h"

#include <exception>
#include <optional>
#include <vector>

// Each judges one part of a service by what is known of it, and asks nobody.

/** The certificates that may sign tokens. */
std::vector<Finding> ExamineTrust(
    const CertificateList& trusted, const Quillon::System::DateTime& now);

/** Whether an exchange with an `https:` URL ended before TLS was agreed upon. */
bool FailedInTls(const Quillon::Http::ExchangeFacts& exchange);

/**
 * The TLS connection of an exchange, with every certificate that the server showed.
 *
 * @param failure  what the exchange ended with, if it failed; of TLS unless the exchange got
 * further.
 */
std::vector<Finding> ExamineTls(
    const Quillon::Http::ExchangeFacts& exchange,
    const std::exception* failure,
    const Quillon::System::DateTime& now);

Finding ExamineClock(
    const Quillon::Http::ExchangeFacts& exchange, const Quillon::System::DateTime& now);

/**
 * The answer to a request that no service should grant.
 *
 * @param failure  what the request ended with; null if it was granted.
 */
Finding ExamineAnswer(
    const std::optional<Quillon::Http::ExchangeFacts>& exchange, const std::exception* failure);
