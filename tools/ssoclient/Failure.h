#pragma once

#include "ExitCode.h"
#include "Presentation.h"

#include "quillon/http/ExchangeFacts.h"

#include <exception>
#include <optional>

/**
 * Writes a failure to standard error: the line `ssoclient: CLASS: MESSAGE`, or the same as one line
 * of JSON, and what can be done about it if the presentation shows that.
 *
 * @param exchange  the latest with the service, if there was one.
 */
void ReportFailure(
    const std::exception& error,
    const std::optional<Quillon::Http::ExchangeFacts>& exchange,
    const Presentation& presentation);
