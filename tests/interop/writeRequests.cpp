// Writes every kind of request that the library builds to a file of its own, for other programs
// to judge: interop_requests FOLDER KEY TIME [DIALECT], where KEY names a key of the test data.

#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/protocol/RequestBuilderImpl.h"
#include "support/FixedClock.h"
#include "support/TestData.h"

#include <exception>
#include <fstream>
#include <functional>
#include <iostream>
#include <map>

using namespace SsoClient;

namespace {

using TokenPtr = boost::shared_ptr<const SamlToken>;

TokenPtr ReadToken(const std::string& name)
{
    // The tokens of the test data are valid at this time.
    const FixedClock clock("2026-06-15T12:00:00Z");
    return CreateSamlToken(
        ReadTestData("tokens/accepted/" + name + ".xml"), GetTestCertificates("sts"));
}

TokenSpec MakeDelegatingSpec()
{
    TokenSpec spec;
    spec.delegateTo = "proxy";
    return spec;
}

/** A token spec with every field set. */
TokenSpec MakeFullSpec(AudienceForm form)
{
    TokenSpec spec = MakeDelegatingSpec();
    spec.renewable = true;
    spec.delegable = true;
    spec.audienceRestriction = {"https://one.example.com", "https://two.example.com/a?b&c"};
    if (form == AudienceForm::APPLIES_TO) {
        spec.audienceRestriction.erase("https://one.example.com");
    }
    spec.advice = {
        {"urn:source", {{"urn:name", {"value", "<&\">"}}, {"urn:empty", {}}}}, {"urn:nothing", {}}};
    return spec;
}

RequestForm MakeForm(const std::string& dialect)
{
    const std::map<std::string, ServiceDialect> dialects = {
        {"default", ServiceDialect::Default()},
        {"cxf", ServiceDialect::ApacheCxf()},
        {"adfs13", ServiceDialect::AdFs13()},
        {"adfs2005", ServiceDialect::AdFs2005()}};
    RequestForm form;
    form.dialect = dialects.at(dialect);
    form.url = "https://sts.example.com/trust";
    return form;
}

class RequestWriter
{
public:
    RequestWriter(const std::string& folder, const std::string& key, const RequestForm& form)
        : _folder(folder)
        , _fullSpec(MakeFullSpec(form.dialect.audienceForm))
        , _withoutKey(boost::none, form)
        , _withKey(HolderOfKeyConfig{GetTestKey(key), GetTestCertificates(key).front()}, form)
    {}

    void WriteAll() const
    {
        WritePasswordRequests();
        WriteCertificateRequests();
        WriteExchangeRequests();
        WriteTokenRequests();
        WriteNegotiationRequests();
    }

private:
    void WritePasswordRequests() const
    {
        const auto build =
            [](const RequestBuilder& builder, const TokenSpec& spec, Request& request) {
                builder.BuildUserPassTokenRequest("jdoe", "s3cret", spec, request);
            };
        Write("password", [&](Request& out) { build(_withoutKey, TokenSpec(), out); });
        Write("password-full", [&](Request& out) { build(_withoutKey, _fullSpec, out); });
        Write("password-signed", [&](Request& out) { build(_withKey, TokenSpec(), out); });
        Write("password-delegating", [&](Request& out) {
            build(_withKey, MakeDelegatingSpec(), out);
        });
    }

    void WriteCertificateRequests() const
    {
        Write("certificate", [&](Request& out) {
            _withKey.BuildCertificateTokenRequest(TokenSpec(), out);
        });
        Write("certificate-full", [&](Request& out) {
            _withKey.BuildCertificateTokenRequest(_fullSpec, out);
        });
    }

    void WriteExchangeRequests() const
    {
        Write("exchange", [&](Request& out) {
            _withKey.BuildExchangeTokenRequest(*_holderOfKey, TokenSpec(), out);
        });
        Write("exchange-full", [&](Request& out) {
            _withKey.BuildExchangeTokenRequest(*_holderOfKey, _fullSpec, out);
        });
        Write("exchange-bearer", [&](Request& out) {
            _withKey.BuildExchangeTokenRequest(*_bearer, TokenSpec(), out);
        });
    }

    void WriteTokenRequests() const
    {
        Write("renew", [&](Request& out) { _withKey.BuildRenewRequest(*_holderOfKey, 600, out); });
        Write("validate", [&](Request& out) {
            _withoutKey.BuildValidateSubjectRequest(*_holderOfKey, out);
        });
    }

    void WriteNegotiationRequests() const
    {
        const Leg leg{'l', 'e', 'g'};
        Write("negotiation-first", [&](Request& out) {
            _withoutKey.BuildInitialSPNegoRequest(_fullSpec, leg, out);
        });
        Write("negotiation-first-signed", [&](Request& out) {
            _withKey.BuildInitialSPNegoRequest(TokenSpec(), leg, out);
        });
        Write("negotiation-next", [&](Request& out) {
            _withKey.BuildContinuedSPNegoRequest("urn:example:context", leg, out);
        });
    }

    void Write(const std::string& name, const std::function<void(Request&)>& build) const
    {
        Request request;
        build(request);
        std::ofstream file(_folder + "/" + name + ".xml", std::ios::binary);
        file.exceptions(std::ios::failbit | std::ios::badbit);
        file << request.body << std::flush;
    }

    const std::string _folder;
    const TokenSpec _fullSpec;
    const RequestBuilderImpl _withoutKey;
    const RequestBuilderImpl _withKey;
    const TokenPtr _holderOfKey = ReadToken("holder-of-key");
    const TokenPtr _bearer = ReadToken("bearer");
};

} // namespace

int main(int argc, char** argv)
{
    if (argc != 4 && argc != 5) {
        std::cerr << "usage: interop_requests FOLDER KEY TIME [DIALECT]\n";
        return 2;
    }
    try {
        const RequestForm form = argc == 5 ? MakeForm(argv[4]) : RequestForm();
        const RequestWriter writer(argv[1], argv[2], form);
        const FixedClock clock(argv[3]);
        writer.WriteAll();
    } catch (const std::exception& error) {
        std::cerr << "interop_requests: " << error.what() << "\n";
        return 1;
    }
    return 0;
}
