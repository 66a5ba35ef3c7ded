#include "HttpClient.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using namespace Quillon::Http;
using Quillon::InvalidArgumentException;
using Quillon::Ref;
using Testing::GetArgumentError;

namespace {

// [RFC 3986 3.3]
TEST(CreateHttpRequest, RefusesPathsThatWouldChangeTheRequestLine)
{
    for (const std::string path : {"", "x", "/a b", "/a\r\nX: y", "http://host/", "/a#b"}) {
        Ref<ClientRequest> request;
        EXPECT_EQ(
            "Invalid argument : \"" + path + "\" is not the path of a URL.",
            GetArgumentError([&] { CreateHttpRequest(HttpMethod::POST, path, request); }));
    }
}

TEST(CreateHttpRequest, KnowsOnlyPost)
{
    EXPECT_EQ(3, static_cast<int>(HttpMethod::POST));
    Ref<ClientRequest> request;
    EXPECT_EQ("Invalid argument : There is no HTTP method 1.", GetArgumentError([&] {
                  CreateHttpRequest(static_cast<HttpMethod>(1), "/", request);
              }));
}

TEST(SetHeader, RefusesValuesThatCouldStartAnotherLine)
{
    const Ref<ClientRequest> request = Testing::HttpClient::MakeRequest();
    for (const std::string& value :
         {std::string("a\r\nEvil: 1"),
          std::string("a\nb"),
          std::string("a\0b", 3),
          std::string("\x7F")}) {
        EXPECT_EQ(
            "Invalid argument : The value of the header field SOAPAction has a control "
            "character.",
            GetArgumentError([&] { request->SetHeader("SOAPAction", value); }));
    }
}

// [RFC 9110 5.6.2]
TEST(SetHeader, RefusesNamesThatAreNoTokens)
{
    const Ref<ClientRequest> request = Testing::HttpClient::MakeRequest();
    for (const std::string name : {"", "A B", "A:", "A\r\n", "\xC3\xA9"}) {
        EXPECT_EQ(
            "Invalid argument : \"" + name + "\" is not the name of a header field.",
            GetArgumentError([&] { request->SetHeader(name, "x"); }));
    }
}

TEST(SetTimeout, RefusesWhatIsNotPositive)
{
    const Ref<ClientRequest> request = Testing::HttpClient::MakeRequest();
    EXPECT_EQ(
        "Invalid argument : The time-out of 0 microseconds is not positive.",
        GetArgumentError([&] { request->SetTimeout(0); }));
    EXPECT_EQ(
        "Invalid argument : The time-out of -1 microseconds is not positive.",
        GetArgumentError([&] { request->SetTimeout(-1); }));
    EXPECT_EQ(
        "Invalid argument : The time-out of 0 microseconds is not positive.",
        GetArgumentError([&] { request->SetConnectTimeout(0); }));
}

TEST(CreateTCPConnectionSpec, RefusesMalformedHostsAndPorts)
{
    Ref<ConnectionSpec> spec;
    EXPECT_EQ("Invalid argument : \"a/b\" is not a host name or IP address.", GetArgumentError([&] {
                  CreateTCPConnectionSpec("a/b", 80, false, spec);
              }));
    for (const std::string host : {"a.1", "1.2.3.256", "1.2.3.4.5", "0x7f", "a.0X"}) {
        EXPECT_EQ(
            "Invalid argument : \"" + host + "\" is not a host name or IP address.",
            GetArgumentError([&] { CreateTCPConnectionSpec(host, 80, false, spec); }));
    }
    CreateTCPConnectionSpec("1.a", 80, false, spec);
    CreateTCPConnectionSpec("a.0xg", 80, false, spec);
    EXPECT_EQ(
        "Invalid argument : The port 0 does not lie between 1 and 65535.",
        GetArgumentError([&] { CreateTCPConnectionSpec("a", 0, false, spec); }));
    EXPECT_EQ(
        "Invalid argument : The port 65536 does not lie between 1 and 65535.",
        GetArgumentError([&] { CreateTCPConnectionSpec("a", 65536, false, spec); }));
}

TEST(CreateHttpUserAgent, RefusesAPoolOfAnotherSpec)
{
    Ref<ConnectionSpec> spec;
    Ref<ConnectionSpec> other;
    CreateTCPConnectionSpec("a", 80, false, spec);
    CreateTCPConnectionSpec("a", 80, false, other);
    Ref<HttpConnectionPool> pool;
    CreateHttpConnectionPool(other.get(), pool);
    Ref<UserAgent> agent;
    EXPECT_EQ(
        "Invalid argument : The connection pool is for another connection spec.",
        GetArgumentError([&] { CreateHttpUserAgent(spec.get(), nullptr, pool.get(), agent); }));
    EXPECT_EQ("Invalid argument : There is no connection spec.", GetArgumentError([&] {
                  CreateHttpUserAgent(nullptr, nullptr, nullptr, agent);
              }));
}

} // namespace
