#pragma once

#include "quillon/http/ExchangeFacts.h"

#include <exception>
#include <optional>
#include <string>

/**
 * What a person can do about a failure, in one line; empty if nothing is known to help.
 *
 * @param exchange  the latest with the service, if there was one: the advice names what it showed.
 */
std::string FindHint(
    const std::exception& error, const std::optional<Quillon::Http::ExchangeFacts>& exchange);
