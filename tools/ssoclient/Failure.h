#pragma once

#include "ExitCode.h"
#include "Presentation.h"

#include <exception>

/**
 * Writes a failure to standard error: the line `ssoclient: CLASS: MESSAGE`, or the same as one line
 * of JSON, and what can be done about it if the presentation shows that.
 */
void ReportFailure(const std::exception& error, const Presentation& presentation);
