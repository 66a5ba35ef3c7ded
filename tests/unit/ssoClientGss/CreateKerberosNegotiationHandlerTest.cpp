#include "ssoClientGss/KerberosNegotiationHandler.h"

#include "support/Failure.h"

#include <gtest/gtest.h>

using namespace SsoClient::Gss;

namespace {

const std::string BadArgument = "InvalidArgumentException: Invalid argument : ";

std::string CreateWith(const KerberosOptions& options)
{
    return GetFailure([&] { CreateKerberosNegotiationHandler(options); });
}

KerberosOptions WithService(const std::string& service)
{
    KerberosOptions options;
    options.service = service;
    return options;
}

KerberosOptions WithCredentials(
    const std::string& ccache, const std::string& keytab, const std::string& principal)
{
    KerberosOptions options;
    options.url = "https://sts.example.com/sts";
    options.ccache = ccache;
    options.keytab = keytab;
    options.principal = principal;
    return options;
}

std::string GetServiceFailure(const std::string& service)
{
    return BadArgument + "The service name '" + service
           + "' is neither 'service@host' nor 'service/host' nor 'service/host@REALM'";
}

} // namespace

TEST(CreateKerberosNegotiationHandler, TakesEveryWholeSetOfCredentials)
{
    EXPECT_EQ("none", CreateWith(WithCredentials("", "", "")));
    EXPECT_EQ("none", CreateWith(WithCredentials("FILE:/no/cache", "", "")));
    EXPECT_EQ("none", CreateWith(WithCredentials("", "/no/keytab", "alice")));
}

TEST(CreateKerberosNegotiationHandler, RefusesKeytabWithCache)
{
    const std::string refused = BadArgument + "A keytab and a credential cache exclude each other";
    EXPECT_EQ(refused, CreateWith(WithCredentials("/cache", "/keytab", "alice")));
    EXPECT_EQ(refused, CreateWith(WithCredentials("/cache", "/keytab", "")));
}

TEST(CreateKerberosNegotiationHandler, RefusesKeytabWithoutPrincipal)
{
    EXPECT_EQ(
        BadArgument + "A keytab needs the principal whose key is in it",
        CreateWith(WithCredentials("", "/keytab", "")));
}

TEST(CreateKerberosNegotiationHandler, RefusesPrincipalWithoutKeytab)
{
    const std::string refused = BadArgument + "A principal needs the keytab with its key";
    EXPECT_EQ(refused, CreateWith(WithCredentials("", "", "alice")));
    EXPECT_EQ(refused, CreateWith(WithCredentials("/cache", "", "alice")));
}

TEST(CreateKerberosNegotiationHandler, TakesBothFormsOfServiceName)
{
    EXPECT_EQ("none", CreateWith(WithService("HTTP@host.example.com")));
    EXPECT_EQ("none", CreateWith(WithService("HTTP/host.example.com")));
    EXPECT_EQ("none", CreateWith(WithService("HTTP/host.example.com@EXAMPLE.TEST")));
}

TEST(CreateKerberosNegotiationHandler, RefusesWhatIsNoServiceName)
{
    for (const char* service : {"HTTP", "@host", "HTTP@", "/host", "HTTP/", "HTTP@host@REALM"}) {
        EXPECT_EQ(GetServiceFailure(service), CreateWith(WithService(service)));
    }
}

TEST(CreateKerberosNegotiationHandler, RefusesNeitherUrlNorService)
{
    EXPECT_EQ(
        BadArgument + "Neither a URL nor a service name is given", CreateWith(KerberosOptions()));
}

TEST(CreateKerberosNegotiationHandler, RefusesMalformedUrl)
{
    KerberosOptions options;
    options.url = "ldap://sts.example.com/";
    EXPECT_EQ(
        BadArgument + "The URL is malformed: it does not begin with \"https://\" or \"http://\".",
        CreateWith(options));
}

TEST(CreateKerberosNegotiationHandler, DoesNotReadTheUrlBesideAService)
{
    KerberosOptions options = WithService("HTTP@host.example.com");
    options.url = "ldap://sts.example.com/";
    EXPECT_EQ("none", CreateWith(options));
}

TEST(CreateKerberosNegotiationHandler, RefusesZeroByteInAnyName)
{
    const std::string name("/name\0/of-another", 17);
    EXPECT_EQ(
        BadArgument + "The credential cache has a zero byte",
        CreateWith(WithCredentials(name, "", "")));
    EXPECT_EQ(
        BadArgument + "The keytab has a zero byte", CreateWith(WithCredentials("", name, "alice")));
    EXPECT_EQ(
        BadArgument + "The principal has a zero byte",
        CreateWith(WithCredentials("", "/keytab", name)));
    EXPECT_EQ(
        BadArgument + "The service name has a zero byte", CreateWith(WithService("HTTP" + name)));
}
