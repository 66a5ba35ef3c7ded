#pragma once

#include <cstddef>
#include <string>

namespace Benchmarks {

/** What a token has so many of that it becomes large. */
enum class Bulk
{
    GROUPS,
    ATTRIBUTES,
    NAMESPACES,
    TEXT,
    COMMENTS
};

/** For the names of benchmarks. */
const char* ToString(Bulk bulk) noexcept;

/** A bearer token of about `size` octets, signed by xmlsec1 with the key of the test data. */
std::string MakeToken(Bulk bulk, std::size_t size);

} // namespace Benchmarks
