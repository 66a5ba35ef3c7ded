#include "ssoClientGss/KerberosNegotiationHandler.h"

#include "quillon/Exceptions.h"
#include "quillon/http/HttpURL.h"
#include "ssoClientGss/KerberosNegotiationHandlerImpl.h"

#include <boost/smart_ptr/make_shared.hpp>

namespace SsoClient::Gss {

namespace {

using Quillon::InvalidArgumentException;

/** The C interfaces would take the part before it, and so another name. */
void CheckName(const std::string& what, const std::string& name)
{
    if (name.find('\0') != std::string::npos) {
        throw InvalidArgumentException("The " + what + " has a zero byte");
    }
}

void CheckCredentials(const KerberosOptions& options)
{
    CheckName("credential cache", options.ccache);
    CheckName("keytab", options.keytab);
    CheckName("principal", options.principal);
    if (!options.keytab.empty() && !options.ccache.empty()) {
        throw InvalidArgumentException("A keytab and a credential cache exclude each other");
    }
    if (!options.keytab.empty() && options.principal.empty()) {
        throw InvalidArgumentException("A keytab needs the principal whose key is in it");
    }
    if (options.keytab.empty() && !options.principal.empty()) {
        throw InvalidArgumentException("A principal needs the keytab with its key");
    }
}

std::string GetHost(const std::string& url)
{
    bool isHttps = false;
    std::string host;
    int port = 0;
    std::string path;
    Quillon::Http::ParseHttpURL(url, isHttps, host, port, path);
    return host;
}

/** The given service name, which must be one, or the usual one of a web service [RFC 4559 4.1]. */
std::string GetServiceName(const KerberosOptions& options)
{
    const std::string& service = options.service;
    if (service.empty() && options.url.empty()) {
        throw InvalidArgumentException("Neither a URL nor a service name is given");
    }
    if (service.empty()) {
        return "HTTP@" + GetHost(options.url);
    }
    CheckName("service name", service);
    const bool isPrincipal = service.find('/') != std::string::npos;
    const std::size_t separator = service.find(isPrincipal ? '/' : '@');
    if (separator == std::string::npos || separator == 0 || separator + 1 == service.size()
        || (!isPrincipal && service.find('@', separator + 1) != std::string::npos)) {
        throw InvalidArgumentException(
            "The service name '" + service
            + "' is neither 'service@host' nor 'service/host' nor 'service/host@REALM'");
    }
    return service;
}

} // namespace

boost::shared_ptr<NegotiationHandler> CreateKerberosNegotiationHandler(
    const KerberosOptions& options)
{
    CheckCredentials(options);
    KerberosOptions checked = options;
    checked.service = GetServiceName(options);
    return boost::make_shared<KerberosNegotiationHandlerImpl>(checked);
}

} // namespace SsoClient::Gss
