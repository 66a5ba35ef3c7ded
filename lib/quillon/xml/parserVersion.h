#pragma once

#include <string>

namespace Quillon::Xml {

/** The version of libxml2 that the process has loaded, for example "2.9.14". */
std::string GetParserVersion();

} // namespace Quillon::Xml
