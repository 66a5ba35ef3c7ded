#pragma once

#include "quillon/Export.h"

#include <string>
#include <vector>

namespace Quillon {

/** A library by the name that its project gives it. */
struct LibraryVersion
{
    std::string name;
    std::string version;
};

/**
 * The libraries below this one, in the versions that the process has loaded, which need not be
 * those that it was built with: OpenSSL, libcurl and libxml2, in this order.
 *
 * Thread safety: any thread.
 */
QUILLON_API std::vector<LibraryVersion> GetLibraryVersions();

} // namespace Quillon
