#pragma once

#include "Trust.h"

#include <string>

/**
 * Says in a line on standard error that a token which was refused as one of the default kind would
 * be read with `--general`; nothing if it would not.
 */
void NoteGeneralReading(
    const std::string& token, const CertificateList& trusted, long long clockToleranceSec);
