#pragma once

#include "ExitCode.h"

#include <CLI/App.hpp>

#include <functional>

/** What a command does once its arguments are known to be well-formed. */
using Action = std::function<ExitCode()>;

/**
 * Each adds one command to `parent`; when the command line names it, parsing puts what it does
 * into `action`.
 */
void AddAcquirePasswordCommand(CLI::App& parent, Action& action);
void AddAcquireCertificateCommand(CLI::App& parent, Action& action);
void AddAcquireTokenCommand(CLI::App& parent, Action& action);
void AddAcquireGssCommand(CLI::App& parent, Action& action);
void AddRenewCommand(CLI::App& parent, Action& action);
void AddValidateCommand(CLI::App& parent, Action& action);
void AddInspectCommand(CLI::App& parent, Action& action);
