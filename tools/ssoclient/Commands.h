#pragma once

#include "CommandLine.h"
#include "ExitCode.h"

#include <functional>

/** What a command does once its arguments are known to be well-formed. */
using Action = std::function<ExitCode()>;

/**
 * Each adds one command to `parent`; when the command line names it, parsing puts what it does
 * into `action`.
 */
void AddAcquirePasswordCommand(const Command& parent, Action& action);
void AddAcquireCertificateCommand(const Command& parent, Action& action);
void AddAcquireTokenCommand(const Command& parent, Action& action);
void AddAcquireGssCommand(const Command& parent, Action& action);
void AddRenewCommand(const Command& parent, Action& action);
void AddValidateCommand(const Command& parent, Action& action);
void AddInspectCommand(const Command& parent, Action& action);
