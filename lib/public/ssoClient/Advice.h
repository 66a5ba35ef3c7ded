#pragma once

#include <string>
#include <vector>

namespace SsoClient {

/** One attribute of an advice. */
struct AdviceAttribute
{
    std::string name; ///< a URI in practice
    std::vector<std::string> values;
};

/** Attributes that a relying party asks the token service to place into the issued token. */
struct Advice
{
    std::string source; ///< a URI
    std::vector<AdviceAttribute> attributes;
};

} // namespace SsoClient
