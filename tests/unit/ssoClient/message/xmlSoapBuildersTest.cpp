#include "ssoClient/xmlSoapBuilders.h"

#include "builderText.h"

#include <gtest/gtest.h>

using namespace SsoClient;

TEST(SoapBuilder, WrapsHeaderAndBody)
{
    EXPECT_EQ(
        ToText(SoapBuilder(ElementBuilder("p", "h"), ElementBuilder("p", "b"))),
        "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">"
        "<soapenv:Header><p:h/></soapenv:Header>"
        "<soapenv:Body xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\"><p:b/>"
        "</soapenv:Body></soapenv:Envelope>");
}

TEST(SoapBuilder, LeavesElementsEmptyWithoutTheirParts)
{
    EXPECT_EQ(
        ToText(SoapBuilder(nullptr, nullptr)),
        "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">"
        "<soapenv:Header/>"
        "<soapenv:Body xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\"/>"
        "</soapenv:Envelope>");
}
