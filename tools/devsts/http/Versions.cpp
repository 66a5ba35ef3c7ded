#include "devsts/http/Versions.h"

#include <libxml/parser.h>
#include <openssl/crypto.h>
#include <xmlsec/version.h>

#include <cstdlib>

namespace DevSts {

namespace {

// libxml2 has it as one number: 20914 is 2.9.14.
std::string DescribeLibxml2()
{
    const int number = std::atoi(xmlParserVersion);
    return std::to_string(number / 10000) + "." + std::to_string(number / 100 % 100) + "."
           + std::to_string(number % 100);
}

} // namespace

std::string DescribeVersions()
{
    return DEVSTS_VERSION "\nOpenSSL " + std::string(OpenSSL_version(OPENSSL_VERSION_STRING))
           + ", libxml2 " + DescribeLibxml2()
           + "; built with xmlsec1 " XMLSEC_VERSION ", MIT Kerberos " DEVSTS_KERBEROS_VERSION;
}

} // namespace DevSts
