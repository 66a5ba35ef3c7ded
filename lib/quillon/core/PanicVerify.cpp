#include "quillon/PanicVerify.h"

#include <cstdio>
#include <cstdlib>

namespace Quillon {

void PanicVerify(const char* expression, const char* unit, int line) noexcept
{
    std::fprintf(stderr, "PanicVerify failed: %s (%s:%d)\n", expression, unit, line);
    std::abort();
}

} // namespace Quillon
