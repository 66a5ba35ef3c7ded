#pragma once

#include "CommandLine.h"
#include "ExchangeRecord.h"
#include "ExitCode.h"
#include "Presentation.h"

#include <functional>

/** What the command line asks for. */
struct Invocation
{
    /** What the command does once its arguments are known to be well-formed. */
    std::function<ExitCode()> action;
    Presentation presentation;
    ExchangeRecord exchanges; ///< with the service
    std::string passage;      ///< of a file that is refused; empty if it is not known
};

/**
 * Each adds one command to `parent`; when the command line names it, parsing puts what it does
 * into the action of `invocation`, and how it speaks into the presentation.
 */
void AddAcquirePasswordCommand(const Command& parent, Invocation& invocation);
void AddAcquireCertificateCommand(const Command& parent, Invocation& invocation);
void AddAcquireTokenCommand(const Command& parent, Invocation& invocation);
void AddAcquireGssCommand(const Command& parent, Invocation& invocation);
void AddKeepCommand(const Command& parent, Invocation& invocation);
void AddRenewCommand(const Command& parent, Invocation& invocation);
void AddValidateCommand(const Command& parent, Invocation& invocation);
void AddInspectCommand(const Command& parent, Invocation& invocation);
void AddDoctorCommand(const Command& parent, Invocation& invocation);
void AddProfileCommand(const Command& parent, Invocation& invocation);
