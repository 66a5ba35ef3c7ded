#include "Hints.h"

#include "Duration.h"
#include "OneLine.h"

#include "quillon/Exceptions.h"
#include "quillon/http/ConnectionSpec.h"
#include "quillon/system/Clock.h"

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <string_view>

using Quillon::Http::ExchangeFacts;

namespace {

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
     "the service does not grant what is asked for, or not for such credentials: try without "
     "--lifetime, --delegate-to, "
     "--audience, --advice, --renewable and --delegable, and add them one by one"},
    {"BadRequest; request failed.",
     "the service does not understand the request: check that --url is its WS-Trust 1.3 endpoint "
     "for these credentials, and whether it wants a --dialect"},
    {"InvalidTimeRange; request failed.", "ask for a shorter --lifetime"},
    {"InvalidScope; request failed.", "the service does not know the audience: check --audience"},
    {"RenewNeeded; request failed.", "acquire a new token"},
    {"FailedCheck; request failed.",
     "the service cannot verify what was signed: check that --key and --cert are those that it "
     "knows, and look for what changes requests on the way"},
    {"SecurityTokenUnavailable; request failed.",
     "the service does not know the certificate: register that of --cert with it"},
    {"InvalidSecurity; request failed.",
     "services often have an endpoint for each kind of credentials: check that --url is the one "
     "for these"},
    {"UnsupportedSecurityToken; request failed.",
     "services often have an endpoint for each kind of credentials: check that --url is the one "
     "for these"},
    {"MustUnderstand; request failed.",
     "the endpoint does not know WS-Security: --url must be the address of the WS-Trust service "
     "itself"},
    {"VersionMismatch; request failed.",
     "the endpoint speaks another version of SOAP: use the service's endpoint for SOAP 1.1, or a "
     "--dialect with the version that it speaks"},
    {"than was asked for: its subject is ",
     "do not use it, unless the service names its users otherwise than they log on: then say how, "
     "with --subject and --domain"},
    {"The service issued another token than was asked for: ",
     "the service has limits of its own: ask for what it gives, or have its operator change them"},
    {"Response is not well-formed XML: ",
     "the reply may be a web page, such as a login form: --url must be the address of the WS-Trust "
     "service itself"},
    {"missing SAOP Body",
     "the reply may be a web page, such as a login form: --url must be the address of the WS-Trust "
     "service itself"},
    {"Unexpected XML format",
     "--url must be the address of a WS-Trust 1.3 service; if it is, its operator must mend the "
     "answer"},
    {"Server returned error: 30",
     "redirects are not followed: --url must be the address of the service itself",
     &DescribeRedirect},
    {"Server returned error: 401",
     "something before the service wants a log-on of its own: ask its operator for an address "
     "without it"},
    {"Server returned error: 403",
     "something before the service keeps this machine or this path out: check --url, and ask its "
     "operator"},
    {"Server returned error: 404", "check the path of --url"},
    {"Server returned error: 407",
     "a proxy wants a log-on of its own: ask for a way to the service without it"},
    {"Server returned error: 4", "the server does not take such requests there: check --url"},
    {"Server returned error: 5",
     "the service, or a proxy before it, is ill: try again later, then ask its operator, with the "
     "time"},
    {"cannot be resolved",
     "check the host of --url; `getent hosts NAME` asks this machine's resolver the same"},
    {"Cannot connect to ",
     "check host and port of --url, whether the service runs, and whether a firewall stands in "
     "between"},
    {"There was no connection to ",
     "a firewall may drop what is sent: check host and port of --url"},
    {"There was no complete reply from ",
     "try again; if it repeats, ask the service's operator, or wait longer with --timeout"},
    {"wrong version number",
     "the server does not speak TLS there: check the port of --url, and whether it is an http: "
     "service"},
    {"without a reply", "check the port of --url, and whether it is an https: service"},
    {"refuses a client without a TLS certificate",
     "this program has none to show in TLS: use an endpoint of the service that asks for none"},
    {"certificate has expired",
     "the server's operator must renew its certificate, unless this machine's clock is wrong",
     &DescribeShownCertificate},
    {"is refused: hostname mismatch",
     "use the name that the server's certificate has in --url, or name it with --peer",
     &DescribeShownCertificate},
    {"It must name \"",
     "--ca takes the authority of the server's TLS certificate, --trust the certificates that sign "
     "tokens: they may be mixed up",
     &DescribeShownCertificate},
    {"is not the pinned one",
     "somebody may stand in between. If the server has a new key, have its operator confirm the "
     "pin",
     &DescribeShownPin},
    {"The TLS handshake with ",
     "the server must speak TLS 1.2 or 1.3, with keys that are not too weak: `openssl s_client "
     "-connect HOST:PORT` shows more"},
    {" is not HTTP",
     "something else than a web service listens there: check host and port of --url"},
    {" ended too early: ", "try again; if it repeats, look for what cuts connections on the way"},
    {", which nobody asked for.",
     "the server or a proxy before it must not compress what nobody asked to be compressed"},
    {"The reply of ", "--url must be the address of the WS-Trust service itself"},
    {"is not one of the",
     "--trust takes the certificates that sign tokens, --ca the authority of the server's TLS "
     "certificate: are they mixed up? Or has the service a new signing certificate?"},
    {"The PEM text holds no certificate",
     "a certificate in DER form becomes PEM with: openssl x509 -inform DER -in FILE -out FILE.pem; "
     "those in PKCS#12 with: openssl pkcs12 -nokeys -in FILE -out FILE.pem"},
    {"the private key is not that of ",
     "`openssl x509 -in CERT -noout -pubkey` and `openssl pkey -in KEY -pubout` print the same for "
     "a "
     "certificate and its key"},
    {"requests are signed with an RSA key",
     "make such a key, and have a certificate issued for it"},
    {"the passphrase is wrong", "`openssl pkey -in FILE -noout` asks for the same passphrase"},
    {"Cannot read the private key: ",
     "a key in PKCS#12 becomes PEM with: openssl pkcs12 -nocerts -in FILE -out FILE.pem"},
    {"Cannot open 'pkcs11:",
     "OpenSSL needs a provider for pkcs11: URIs, which its configuration loads: `openssl list "
     "-providers` shows those that are there"},
    {"the provided token must be Holder Of Key",
     "bearer tokens cannot be renewed: acquire a new one, with --key and --cert if it is to be "
     "renewed"},
    {"token might have been tampered with",
     "the token is not what was signed. Pretty-printing it, or editing blanks and line ends, is a "
     "change too: use the file as --out wrote it"},
    {"Signature syntax error: ",
     "the token is not what was signed. Pretty-printing it, or editing blanks and line ends, is a "
     "change too: use the file as --out wrote it"},
    {"The token has expired at: ", "acquire a new one, and check this machine's clock"},
    {"Token start date is in the future: ", "check this machine's clock"},
    {"Token lifetime must be positive", "give --lifetime at least 1 second"},
    {"The URL is malformed: ", "write --url as https://HOST[:PORT]/PATH"},
    {"The pinned key ", "`ssoclient doctor --url URL` shows the pin that the server has"},
    {"is encrypted, and the rules have no key", "give the private key with --decrypt-key"},
    {"cannot be decrypted with the keys",
     "check that the key of --decrypt-key belongs to the certificate that the producer encrypts "
     "for"},
    {"assertions are decrypted with an RSA key",
     "have the producer encrypt for an RSA key, and give that with --decrypt-key"},
    {"No rule fits the subject",
     "name the format or the attribute that the message tells, with --subject"},
    {"An audience restriction names ",
     "the assertion is for somebody else: check --audience, and whom it was issued for"},
    {"cannot write `", "check that the folder is there, and that this user may write to it"},
    {"is not a regular file",
     "name a new file or one to replace; --out - writes to standard output"},
    {"cannot open `", "check the name, and that this user may read the file"},
    {"cannot read ", "check the name, and that this user may read the file"},
    {"' line ", "mend that line of the file; `ssoclient profile show NAME` tries it again"},
    {"the password is empty", "the password is the first line of the file"},
    {" is longer than ", "check that this is the right file: its first line counts"},
    {"Cannot use the default credentials", "run kinit; `klist` shows the tickets that are there"},
    {"Ticket expired", "run kinit again"},
    {"Cannot contact any KDC",
     "no key distribution centre of the realm answers: check the realm, the network, and "
     "/etc/krb5.conf or what KRB5_CONFIG names"},
    {"not found in Kerberos database",
     "the realm does not know this name: check the principal, or for a service the host of --url, "
     "or name the service with --service"},
    {"Cannot use the credential cache ", "run kinit; `klist -c CACHE` shows what is in the cache"},
    {"Cannot log on as ", "`klist -k FILE` shows the keys of a keytab, and whose they are"},
    {"Cannot read the Kerberos configuration: ",
     "mend /etc/krb5.conf, or the file that KRB5_CONFIG names"},
    {"Authentication failed", "check the user name and the password, key, token or ticket"},
};

struct ClassHint
{
    std::string_view className;
    std::string_view text;
};

// For what no row above fits. Usage errors say themselves what to do.
constexpr ClassHint ClassHints[] = {
    {"HttpException",
     "`ssoclient doctor --url URL` examines the service, from its name to its answer"},
    {"InvalidArgumentException", "`ssoclient help COMMAND` says what its options take"},
    {"InvalidSignatureException",
     "do not use the token: whoever issued it must mend what the message names"},
    {"NegotiationException",
     "`kvno SERVICE` tries the same with Kerberos' own program, and `klist` shows the tickets"},
    {"ParseException",
     "whoever made the token must change it; assertions of other producers are read with "
     "--general"},
    {"SsoException",
     "the service's own log knows more: ask its operator, with the time; --verbose shows all that "
     "it said"},
    {"XMLParseException",
     "the file must hold the assertion alone, whole and unchanged, as --out wrote it"},
};

std::string_view FindClassHint(const std::exception& error)
{
    const std::string className = Quillon::GetClassName(error);
    const auto* found =
        std::find_if(std::begin(ClassHints), std::end(ClassHints), [&](const ClassHint& hint) {
            return hint.className == className;
        });
    return found == std::end(ClassHints) ? "" : found->text;
}

} // namespace

std::string FindHint(const std::exception& error, const std::optional<ExchangeFacts>& exchange)
{
    const std::string_view message = error.what();
    const auto* found = std::find_if(std::begin(Hints), std::end(Hints), [&](const Hint& hint) {
        return message.find(hint.in) != std::string_view::npos;
    });
    if (found == std::end(Hints)) {
        return std::string(FindClassHint(error));
    }
    const bool isTold = found->describe != nullptr && exchange;
    return std::string(found->text) + (isTold ? found->describe(*exchange) : "");
}
