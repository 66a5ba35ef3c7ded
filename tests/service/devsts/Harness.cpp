#include "Harness.h"

#include "Requests.h"

#include <array>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <httplib.h>
#include <iterator>
#include <libxml/parser.h>
#include <libxml/xpath.h>
#include <libxml/xpathInternals.h>
#include <memory>
#include <stdexcept>
#include <sys/wait.h>

namespace DevStsTests {

namespace fs = std::filesystem;

namespace {

struct XmlDeleter
{
    void operator()(xmlDoc* doc) const { xmlFreeDoc(doc); }
    void operator()(xmlXPathContext* context) const { xmlXPathFreeContext(context); }
    void operator()(xmlXPathObject* object) const { xmlXPathFreeObject(object); }
    void operator()(xmlChar* text) const { xmlFree(text); }
};

const xmlChar* Chars(const std::string& text)
{
    return reinterpret_cast<const xmlChar*>(text.c_str());
}

DevSts::Options TestOptions(
    DevSts::Options options, const fs::path& state, const std::atomic<DevSts::TimePoint>& now)
{
    options.stateDir = state;
    options.plainHttp = true;
    options.clock = [&now] { return now.load(); };
    return options;
}

} // namespace

TempDir::TempDir()
{
    std::string pattern = (fs::temp_directory_path() / "devsts-test-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) {
        throw std::runtime_error("mkdtemp failed");
    }
    _path = pattern;
}

TempDir::~TempDir()
{
    std::error_code ignored;
    fs::remove_all(_path, ignored);
}

const fs::path& SharedState()
{
    static const TempDir dir;
    static const DevSts::Server filled = [] {
        DevSts::Options options;
        options.stateDir = dir.Path();
        return DevSts::Server(options);
    }();
    return dir.Path();
}

StateCopy::StateCopy()
{
    fs::copy(SharedState(), Path());
}

std::string ReadText(const fs::path& path)
{
    std::ifstream file(path, std::ios::binary);
    if (!file) {
        throw std::runtime_error("cannot read " + path.string());
    }
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

void WriteText(const fs::path& path, const std::string& text)
{
    std::ofstream file(path, std::ios::binary | std::ios::trunc);
    file << text;
    file.close();
    if (!file) {
        throw std::runtime_error("cannot write " + path.string());
    }
}

CommandResult RunCommand(const std::string& command)
{
    FILE* pipe = popen((command + " 2>&1").c_str(), "r");
    if (pipe == nullptr) {
        throw std::runtime_error("popen failed");
    }
    std::string output;
    std::array<char, 4096> buffer{};
    std::size_t size = 0;
    while ((size = fread(buffer.data(), 1, buffer.size(), pipe)) > 0) {
        output.append(buffer.data(), size);
    }
    const int status = pclose(pipe);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, output};
}

std::string Replaced(const std::string& text, const std::string& from, const std::string& to)
{
    const std::size_t at = text.find(from);
    if (at == std::string::npos || text.find(from, at + 1) != std::string::npos) {
        throw std::logic_error("not exactly once in the text: " + from);
    }
    return text.substr(0, at) + to + text.substr(at + from.size());
}

std::vector<std::string> Find(const std::string& xml, const std::string& expression)
{
    const std::unique_ptr<xmlDoc, XmlDeleter> doc(
        xmlReadMemory(xml.data(), static_cast<int>(xml.size()), nullptr, nullptr, XML_PARSE_NONET));
    if (doc == nullptr) {
        ADD_FAILURE() << "not XML: " << xml;
        return {};
    }
    const std::unique_ptr<xmlXPathContext, XmlDeleter> context(xmlXPathNewContext(doc.get()));
    for (const auto& [prefix, uri] : Prefixes()) {
        xmlXPathRegisterNs(context.get(), Chars(prefix), Chars(uri));
    }
    const std::unique_ptr<xmlXPathObject, XmlDeleter> found(
        xmlXPathEvalExpression(Chars(expression), context.get()));
    if (found == nullptr) {
        throw std::logic_error("not an XPath expression: " + expression);
    }
    std::vector<std::string> texts;
    for (int i = 0; found->nodesetval != nullptr && i < found->nodesetval->nodeNr; ++i) {
        const std::unique_ptr<xmlChar, XmlDeleter> text(
            xmlNodeGetContent(found->nodesetval->nodeTab[i]));
        texts.emplace_back(reinterpret_cast<const char*>(text.get()));
    }
    return texts;
}

std::string FindOne(const std::string& xml, const std::string& expression)
{
    const std::vector<std::string> texts = Find(xml, expression);
    if (texts.size() != 1) {
        ADD_FAILURE() << texts.size() << " nodes for " << expression << " in " << xml;
        return "";
    }
    return texts.front();
}

std::string AssertionIn(const std::string& reply)
{
    static const std::string end = "</saml:Assertion>";
    const std::size_t from = reply.find("<saml:Assertion ");
    const std::size_t to = reply.rfind(end);
    if (from == std::string::npos || to == std::string::npos) {
        ADD_FAILURE() << "no assertion in " << reply;
        return "";
    }
    return reply.substr(from, to + end.size() - from);
}

bool VerifiesWithXmlSec(const std::string& assertion)
{
    const TempDir dir;
    const fs::path file = dir.Path() / "assertion.xml";
    WriteText(file, assertion);
    return RunCommand(
               std::string(XMLSEC1_PROGRAM) + " --verify --id-attr:ID " + Ns::Saml
               + ":Assertion --pubkey-cert-pem " + (SharedState() / "sts.pem").string() + " "
               + file.string())
               .exitCode
           == 0;
}

ServerTest::ServerTest(const fs::path& state, DevSts::Options options)
    : _server(TestOptions(std::move(options), state, _now))
    , _port(_server.Start())
{}

DevSts::TimePoint ServerTest::StartTime()
{
    using namespace std::chrono;
    return DevSts::TimePoint(sys_days(year(2026) / November / 20)) + hours(12);
}

HttpResult ServerTest::Post(
    const std::string& action, const std::string& body, const DevSts::Headers& headers)
{
    httplib::Client client("127.0.0.1", _port);
    httplib::Headers all(headers.begin(), headers.end());
    all.emplace("SOAPAction", '"' + action + '"');
    const auto result = client.Post("/sts", all, body, "text/xml");
    if (!result) {
        ADD_FAILURE() << "no answer: " << to_string(result.error());
        return {};
    }
    HttpResult http{result->status, result->body, {}};
    http.headers.insert(result->headers.begin(), result->headers.end());
    return http;
}

HttpResult ServerTest::PostIssue(const std::string& body)
{
    return Post(std::string(Ns::Wst) + "/RST/Issue", body);
}

std::string ServerTest::FaultText(const HttpResult& result, const std::string& code)
{
    EXPECT_EQ(result.status, 500);
    EXPECT_EQ(FindOne(result.body, "/soapenv:Envelope/soapenv:Body/soapenv:Fault/faultcode"), code);
    return FindOne(result.body, "/soapenv:Envelope/soapenv:Body/soapenv:Fault/faultstring");
}

} // namespace DevStsTests
