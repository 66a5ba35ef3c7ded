#include "quillon/LibraryVersions.h"

#include "crypto/OpenSsl.h"
#include "http/Curl.h"
#include "xml/parserVersion.h"

namespace Quillon {

std::vector<LibraryVersion> GetLibraryVersions()
{
    return {
        {"OpenSSL", OpenSSL_version(OPENSSL_VERSION_STRING)},
        {"libcurl", curl_version_info(CURLVERSION_NOW)->version},
        {"libxml2", Xml::GetParserVersion()}};
}

} // namespace Quillon
