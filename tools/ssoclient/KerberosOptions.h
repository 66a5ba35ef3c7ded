#pragma once

#include "CommandLine.h"

#include "ssoClientGss/KerberosNegotiationHandler.h"

/** Adds `--service`, `--ccache`, `--keytab` and `--principal`. */
void AddKerberosTo(const Command& command, SsoClient::Gss::KerberosOptions& options);
