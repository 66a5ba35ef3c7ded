#pragma once

#include "ExchangeRecord.h"
#include "KeepOptions.h"
#include "Presentation.h"

/**
 * Keeps a token file until the process is told to end, by SIGTERM or SIGINT. SIGHUP has another
 * token asked for at once. Blocks these signals, and SIGCHLD, for the rest of the process's life.
 *
 * @param exchanges  with the service, for hints.
 * @throws UsageError  it cannot begin: the options do not fit, or a file or an address cannot be
 *                     used. What fails later is told and tried again.
 */
void Keep(
    const KeepOptions& options, const Presentation& presentation, const ExchangeRecord& exchanges);
