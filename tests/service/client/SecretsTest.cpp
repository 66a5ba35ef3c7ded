#include "Operations.h"

#include "support/TestData.h"
#include "support/TestTls.h"

#include <gmock/gmock.h>

#include <openssl/core_names.h>

#include <sstream>

using namespace SsoClient;
using testing::HasSubstr;

namespace {

// The same with and without the escapes of XML, of JSON and of URLs, so that no form is missed.
constexpr char PlantedPassword[] = "Pl4ntedSecretPassw0rd";

/** What happens to an operation, beginning with the reply that the server would give. */
struct Course
{
    const char* name;
    std::function<void(const DevSts::ReceivedRequest&, DevSts::Reply&)> change;
    bool succeeds = false;
};

std::ostream& operator<<(std::ostream& stream, const Course& course)
{
    return stream << course.name;
}

std::string Between(const std::string& text, const std::string& start, const std::string& end)
{
    const std::size_t from = text.find(start);
    return from == std::string::npos
               ? ""
               : text.substr(
                   from + start.size(), text.find(end, from + start.size()) - from - start.size());
}

std::string GetSignatureValue(const std::string& assertion)
{
    return Between(assertion, "<ds:SignatureValue>", "</ds:SignatureValue>");
}

using BigNumber = std::unique_ptr<BIGNUM, Testing::HandleDeleter<BN_clear_free>>;

/** A number of the key in the forms that it could be printed in. */
std::vector<std::string> GetSpellings(const EVP_PKEY* key, const char* parameter)
{
    BIGNUM* raw = nullptr;
    if (EVP_PKEY_get_bn_param(key, parameter, &raw) != 1) {
        throw std::runtime_error(std::string("no parameter ") + parameter);
    }
    const BigNumber number(raw);
    std::vector<unsigned char> bytes(static_cast<std::size_t>(BN_num_bytes(number.get())));
    BN_bn2bin(number.get(), bytes.data());
    std::vector<unsigned char> base64(2 * bytes.size());
    EVP_EncodeBlock(base64.data(), bytes.data(), static_cast<int>(bytes.size()));
    std::string lower;
    std::string upper;
    for (const unsigned char byte : bytes) {
        char digits[3];
        std::snprintf(digits, sizeof digits, "%02x", byte);
        lower += digits;
        std::snprintf(digits, sizeof digits, "%02X", byte);
        upper += digits;
    }
    // A piece is enough, and is found where lines are broken.
    constexpr std::size_t Piece = 40;
    return {
        std::string(reinterpret_cast<const char*>(base64.data())).substr(0, Piece),
        lower.substr(0, Piece),
        upper.substr(0, Piece)};
}

std::vector<std::string> GetSecretsOfKey(const std::string& pem)
{
    std::vector<std::string> secrets;
    std::istringstream lines(pem);
    for (std::string line; std::getline(lines, line);) {
        if (line.front() != '-') {
            secrets.push_back(line.substr(0, 40));
        }
    }
    const std::unique_ptr<BIO, Testing::HandleDeleter<BIO_free_all>> text(
        BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
    const Testing::KeyHandle key(PEM_read_bio_PrivateKey(text.get(), nullptr, nullptr, nullptr));
    for (const char* parameter :
         {OSSL_PKEY_PARAM_RSA_N,
          OSSL_PKEY_PARAM_RSA_D,
          OSSL_PKEY_PARAM_RSA_FACTOR1,
          OSSL_PKEY_PARAM_RSA_FACTOR2}) {
        const std::vector<std::string> spellings = GetSpellings(key.get(), parameter);
        secrets.insert(secrets.end(), spellings.begin(), spellings.end());
    }
    return secrets;
}

const std::vector<Course>& GetCourses()
{
    using DevSts::ReceivedRequest;
    using DevSts::Reply;
    static const std::vector<Course> courses{
        {"Success", [](const ReceivedRequest&, Reply&) {}, true},
        {"BadStatusWithEchoedRequest",
         [](const ReceivedRequest& request, Reply& reply) {
             reply.status = 503;
             reply.body = request.body;
         }},
        {"EchoedRequest",
         [](const ReceivedRequest& request, Reply& reply) { reply.body = request.body; }},
        {"EchoedRequestInText",
         [](const ReceivedRequest& request, Reply& reply) {
             reply.body = "You sent: " + request.body;
         }},
        {"EchoedRequestCutShort",
         [](const ReceivedRequest& request, Reply& reply) {
             const std::size_t password = request.body.find(PlantedPassword);
             const std::size_t signature = request.body.rfind("</ds:SignatureValue>");
             reply.body = request.body.substr(
                 0, password != std::string::npos ? password + sizeof PlantedPassword : signature);
         }},
        {"ReplyCutShortInTheToken",
         [](const ReceivedRequest&, Reply& reply) { reply.body.resize(reply.body.size() / 2); }},
        {"Fault",
         [](const ReceivedRequest&, Reply& reply) {
             reply.status = 500;
             reply.body = "<E><Body><Fault><faultcode>Server</faultcode></Fault></Body></E>";
         }},
        {"UnknownStatus",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(
                 reply.body,
                 reply.body.find("/status/valid") != std::string::npos ? "/status/valid"
                                                                       : "RequestedSecurityToken>",
                 "maybe>");
         }},
    };
    return courses;
}

/** What can be wrong with a token. */
const std::vector<Course>& GetTokenCourses()
{
    using DevSts::ReceivedRequest;
    using DevSts::Reply;
    static const std::vector<Course> courses{
        {"ChangedSubject",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, "@example.test", "@Example.test");
         }},
        {"ChangedId",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, " ID=\"_", " ID=\"x");
         }},
        {"ChangedReference",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, "URI=\"#_", "URI=\"#x");
         }},
        {"SignatureValueNotBase64",
         [](const ReceivedRequest&, Reply& reply) {
             const std::string value = GetSignatureValue(reply.body);
             reply.body = Replaced(reply.body, value, value + "!");
         }},
        {"SignatureValueTooShort",
         [](const ReceivedRequest&, Reply& reply) {
             const std::string value = GetSignatureValue(reply.body);
             reply.body = Replaced(reply.body, value, value.substr(0, 300));
         }},
        {"DigestNotBase64",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, "</ds:DigestValue>", "!</ds:DigestValue>");
         }},
        {"TwoSignatureValues",
         [](const ReceivedRequest&, Reply& reply) {
             const std::string value =
                 "<ds:SignatureValue>" + GetSignatureValue(reply.body) + "</ds:SignatureValue>";
             reply.body = Replaced(reply.body, value, value + value);
         }},
        {"UnknownVersion",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, "Version=\"2.0\"", "Version=\"2.1\"");
         }},
        {"UnknownElement",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, "<saml:Subject>", "<saml:Other/><saml:Subject>");
         }},
        {"UndeclaredPrefix",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, "<saml:Subject>", "<no:Other/><saml:Subject>");
         }},
        {"UnknownConfirmationMethod",
         [](const ReceivedRequest&, Reply& reply) {
             reply.body = Replaced(reply.body, ":cm:", ":cx:");
         }},
    };
    return courses;
}

/** Password, private key and tokens are planted, and everything that comes out is searched. */
class Secrets : public HttpStsTest,
                public testing::WithParamInterface<std::tuple<Operation, Course>>
{
protected:
    Secrets()
        : secrets(GetSecretsOfKey(ReadTestData("keys/client-key.pem")))
    {
        TokenSpec spec = MakeSpec();
        spec.renewable = true;
        presented = service->AcquireTokenByCertificate(spec);
        PlantAssertion(presented->ToXml());
        secrets.emplace_back(PlantedPassword);
        state.Write(
            "users.json", Replaced(state.Read("users.json"), AlicesPassword, PlantedPassword));
        log.TakeLines();
    }

    void PlantAssertion(const std::string& xml)
    {
        for (const std::string& secret :
             {Between(xml, " ID=\"", "\""),
              GetSignatureValue(xml).substr(0, 40),
              GetSignatureValue(xml).substr(100, 40),
              Between(xml, "<ds:DigestValue>", "</ds:DigestValue>"),
              Between(xml, "<ds:X509Certificate>", "</ds:X509Certificate>").substr(0, 40)}) {
            ASSERT_GE(secret.size(), 16U) << xml;
            secrets.push_back(secret);
        }
        secrets.emplace_back("<saml:");
    }

    /** Runs the operation as the parameter says. @return all text that it gave. */
    std::string Run()
    {
        const auto& [operation, course] = GetParam();
        server.OnNextReply([this, &change = course.change](
                               const DevSts::ReceivedRequest& request, DevSts::Reply& reply) {
            {
                const std::lock_guard<std::mutex> lock(mutex);
                seenRequest = request.body;
                seenReply = reply.body;
            }
            change(request, reply);
        });
        const std::string text = RunWithoutHook(operation);
        const std::lock_guard<std::mutex> lock(mutex);
        if (operation.givesToken) {
            PlantAssertion(seenReply);
        }
        received = seenRequest;
        return text;
    }

    std::string RunWithoutHook(const Operation& operation)
    {
        testing::internal::CaptureStdout();
        testing::internal::CaptureStderr();
        std::string text;
        try {
            operation.run({*service, *presented, PlantedPassword});
            succeeded = true;
        } catch (const Quillon::Throwable& error) {
            text = error.Dump() + "\n" + error.Where() + "\n";
        }
        EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
        for (const std::string& line : log.TakeLines()) {
            text += line + "\n";
        }
        return text;
    }

    void ExpectNoSecretIn(const std::string& text) const
    {
        for (const std::string& secret : secrets) {
            EXPECT_EQ(text.find(secret), std::string::npos) << secret << " is in:\n" << text;
        }
    }

    ServicePtr service = MakeService();
    TokenPtr presented;
    std::vector<std::string> secrets;
    std::string received;
    std::mutex mutex;
    std::string seenRequest; ///< by the server's thread, which gave `seenReply`
    std::string seenReply;
    bool succeeded = false;
    LogRecorder log;
};

std::string GetName(const testing::TestParamInfo<std::tuple<Operation, Course>>& info)
{
    return std::string(std::get<0>(info.param).name) + "_" + std::get<1>(info.param).name;
}

INSTANTIATE_TEST_SUITE_P(
    All,
    Secrets,
    testing::Combine(testing::ValuesIn(GetOperations()), testing::ValuesIn(GetCourses())),
    GetName);
INSTANTIATE_TEST_SUITE_P(
    Token,
    Secrets,
    testing::Combine(
        testing::ValuesIn(SelectOperations(&Operation::givesToken)),
        testing::ValuesIn(GetTokenCourses())),
    GetName);

/** Failures that come before there is a reply; one run for each operation. */
class SecretsWithoutReply : public Secrets
{};

INSTANTIATE_TEST_SUITE_P(
    All,
    SecretsWithoutReply,
    testing::Combine(testing::ValuesIn(GetOperations()), testing::Values(GetCourses().front())),
    GetName);

} // namespace

TEST_P(Secrets, StayOutOfLogAndExceptions)
{
    const std::string text = Run();
    EXPECT_EQ(succeeded, std::get<1>(GetParam()).succeeds) << text;
    EXPECT_THAT(text, HasSubstr(" START operation "));
    EXPECT_THAT(text, HasSubstr(" END operation "));
    ExpectNoSecretIn(text);
    // They were there to be seen.
    const bool isPassword = std::string(std::get<0>(GetParam()).name) == "AcquireToken";
    const bool isCertificate =
        std::string(std::get<0>(GetParam()).name) == "AcquireTokenByCertificate";
    EXPECT_EQ(received.find(PlantedPassword) != std::string::npos, isPassword);
    EXPECT_EQ(
        received.find(GetSignatureValue(presented->ToXml())) != std::string::npos,
        !isPassword && !isCertificate);
}

TEST_P(SecretsWithoutReply, StayOutWhenTheServerIsGone)
{
    server.Stop();
    const std::string text = RunWithoutHook(std::get<0>(GetParam()));
    EXPECT_FALSE(succeeded);
    ExpectNoSecretIn(text);
}

TEST_P(SecretsWithoutReply, StayOutWhenNobodyIsTrusted)
{
    config.trustedCertificates.clear();
    service = MakeService();
    const std::string text = RunWithoutHook(std::get<0>(GetParam()));
    EXPECT_EQ(succeeded, !std::get<0>(GetParam()).givesToken);
    ExpectNoSecretIn(text);
}

TEST_P(SecretsWithoutReply, StayOutWhenThereIsNoIdentity)
{
    service = MakeBearerService();
    const std::string text = RunWithoutHook(std::get<0>(GetParam()));
    EXPECT_EQ(succeeded, !std::get<0>(GetParam()).needsIdentity);
    ExpectNoSecretIn(text);
}

TEST_P(SecretsWithoutReply, StayOutWhenTheStsRefusesThem)
{
    state.Write("users.json", R"({"users": []})");
    const std::string text = RunWithoutHook(std::get<0>(GetParam()));
    ExpectNoSecretIn(text);
}
