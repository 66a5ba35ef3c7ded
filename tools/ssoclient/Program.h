#pragma once

#include "Commands.h"

#include <memory>

/** The command line of ssoclient with all of its commands, which put into `invocation` what is
 * asked for. */
std::unique_ptr<CommandLine> MakeCommandLine(Invocation& invocation);
