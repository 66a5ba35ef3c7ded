#pragma once

#include "quillon/service/Logger.h"

namespace SsoClient {

/** The library's one logger, "SsoClient"; never null, and kept for the life of the process. */
Quillon::Service::Logger* getLogger(); // NOLINT(readability-identifier-naming)

/** Writes a trace line; `describe` makes its text and is called only if traces are written. */
template <class Describe>
void LogTrace(const Describe& describe)
{
    Quillon::Service::Logger* const logger = getLogger();
    if (logger->IsEnabled(Quillon::Service::LOG_LEVEL_TRACE)) {
        logger->Log(Quillon::Service::LOG_LEVEL_TRACE, describe());
    }
}

} // namespace SsoClient
