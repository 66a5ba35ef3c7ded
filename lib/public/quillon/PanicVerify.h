#pragma once

#include "quillon/Export.h"

namespace Quillon {

/**
 * Reports a violated invariant on standard error (expression, unit and line) and aborts the
 * process. For programming errors only; never for anything that input can cause.
 */
[[noreturn]] QUILLON_API void PanicVerify(
    const char* expression, const char* unit, int line) noexcept;

} // namespace Quillon
