#include "Hints.h"

#include "Duration.h"
#include "OneLine.h"

#include "quillon/http/ConnectionSpec.h"
#include "quillon/system/Clock.h"

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <string_view>

using Quillon::Http::ExchangeFacts;

namespace {

/** How much of a text of the server is repeated. */
constexpr std::size_t MaxShownBytes = 300;

/** Smaller ones come from the way of the reply. */
constexpr long long MaxUnremarkableMicros = 2'000'000;

// Each gives the end of a hint's sentence from what an exchange showed; empty if it showed nothing.

std::string DescribeClocks(const ExchangeFacts& exchange)
{
    if (!exchange.date) {
        return "";
    }
    const long long ahead =
        Quillon::System::GetUtcDateTime().GetUtcTime() - exchange.date->GetUtcTime();
    if (std::abs(ahead) <= MaxUnremarkableMicros) {
        return "; by its reply they agree";
    }
    return "; by its reply this one is " + DescribeDuration(std::abs(ahead))
           + (ahead > 0 ? " ahead" : " behind");
}

std::string DescribeRedirect(const ExchangeFacts& exchange)
{
    return exchange.location.empty() ? ""
                                     : "; it leads to " + Shorten(exchange.location, MaxShownBytes);
}

std::string DescribeShownCertificate(const ExchangeFacts& exchange)
{
    if (exchange.certificates.empty()) {
        return "";
    }
    const Quillon::Crypto::Certificate& shown = *exchange.certificates.front();
    return "; the server shows the certificate of " + Shorten(shown.GetSubjectName(), MaxShownBytes)
           + ", issued by " + Shorten(shown.GetIssuerName(), MaxShownBytes) + " (SHA-256 "
           + shown.GetFingerprint() + ")";
}

std::string DescribeShownPin(const ExchangeFacts& exchange)
{
    return exchange.certificates.empty()
               ? ""
               : "; the key that the server shows has "
                     + Quillon::Http::GetPin(*exchange.certificates.front());
}

struct Hint
{
    std::string_view in; ///< what the message of the failure holds
    std::string_view text;
    std::string (*describe)(const ExchangeFacts& exchange) = nullptr;
};

// The first row that fits counts. Each must be met by a case of the tests.
constexpr Hint Hints[] = {
    {"ExpiredData; request failed.",
     "the service takes the message for too old: compare this machine's clock with the service's",
     &DescribeClocks},
    {"MessageExpired; request failed.",
     "the service takes the message for too old: compare this machine's clock with the service's",
     &DescribeClocks},
    {"UnableToRenew; request failed.",
     "acquire a new token: only one that was acquired with --renewable can be renewed, with the "
     "key that it is bound to, and not for ever"},
    {"InvalidRequest; request failed.",
     "the service does not grant what is asked for: try without --lifetime, --delegate-to, "
     "--audience, --advice, --renewable and --delegable, and add them one by one"},
    {"Response is not well-formed XML: ",
     "the reply may be a web page, such as a login form: --url must be the address of the WS-Trust "
     "service itself"},
    {"missing SAOP Body",
     "the reply may be a web page, such as a login form: --url must be the address of the WS-Trust "
     "service itself"},
    {"Server returned error: 30",
     "redirects are not followed: --url must be the address of the service itself",
     &DescribeRedirect},
    {"Server returned error: 404", "check the path of --url"},
    {"wrong version number",
     "the server does not speak TLS there: check the port of --url, and whether it is an http: "
     "service"},
    {"without a reply", "check the port of --url, and whether it is an https: service"},
    {"is refused: hostname mismatch",
     "use the name that the server's certificate has in --url, or name it with --peer",
     &DescribeShownCertificate},
    {"It must name \"",
     "--ca takes the authority of the server's TLS certificate, --trust the certificates that sign "
     "tokens: are they mixed up?",
     &DescribeShownCertificate},
    {"is not the pinned one",
     "somebody may stand in between. If the server has a new key, have its operator confirm the "
     "pin",
     &DescribeShownPin},
    {"is not one of the",
     "--trust takes the certificates that sign tokens, --ca the authority of the server's TLS "
     "certificate: are they mixed up? Or has the service a new signing certificate?"},
    {"The PEM text holds no certificate",
     "a certificate in DER form becomes PEM with: openssl x509 -inform DER -in FILE -out FILE.pem; "
     "those in PKCS#12 with: openssl pkcs12 -nokeys -in FILE -out FILE.pem"},
    {"the passphrase is wrong", "`openssl pkey -in FILE -noout` asks for the same passphrase"},
    {"Cannot read the private key: ",
     "a key in PKCS#12 becomes PEM with: openssl pkcs12 -nocerts -in FILE -out FILE.pem"},
    {"Cannot open 'pkcs11:",
     "OpenSSL needs a provider for pkcs11: URIs, which its configuration loads: `openssl list "
     "-providers` shows those that are there"},
    {"token might have been tampered with",
     "the token is not what was signed. Pretty-printing it, or editing blanks and line ends, is a "
     "change too: use the file as --out wrote it"},
    {"Signature syntax error: ",
     "the token is not what was signed. Pretty-printing it, or editing blanks and line ends, is a "
     "change too: use the file as --out wrote it"},
    {"The token has expired at: ", "acquire a new one, and check this machine's clock"},
    {"Token start date is in the future: ", "check this machine's clock"},
    {"Cannot use the default credentials", "run kinit; `klist` shows the tickets that are there"},
    {"Authentication failed", "check the user name and the password, key or ticket"},
};

} // namespace

std::string FindHint(const std::exception& error, const std::optional<ExchangeFacts>& exchange)
{
    const std::string_view message = error.what();
    const auto* found = std::find_if(std::begin(Hints), std::end(Hints), [&](const Hint& hint) {
        return message.find(hint.in) != std::string_view::npos;
    });
    if (found == std::end(Hints)) {
        return "";
    }
    const bool isTold = found->describe != nullptr && exchange;
    return std::string(found->text) + (isTold ? found->describe(*exchange) : "");
}
