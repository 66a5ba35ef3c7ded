#include "Arguments.h"
#include "AssertionPage.h"
#include "Commands.h"
#include "Confinement.h"
#include "DialectOptions.h"
#include "ExitCode.h"
#include "Explanation.h"
#include "Files.h"
#include "GeneralReading.h"
#include "PageWriter.h"
#include "Profile.h"
#include "Terminal.h"
#include "TokenOutput.h"
#include "TokenPage.h"
#include "Trust.h"
#include "assertionFacts.h"
#include "passage.h"

#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Exceptions.h"

#include <memory>
#include <optional>

namespace {

struct InspectOptions
{
    std::string file;
    std::vector<std::string> trustFiles;
    std::string pageFile; ///< for a page of HTML; empty for none
    bool verbose = false;
    long long clockToleranceSec = SsoClient::DefaultClockToleranceSec;
    ReadingOptions reading;
    std::optional<std::string> audience;
    std::optional<std::string> recipient;

    /** Whether an option only has a meaning for assertions of any producer. */
    bool IsGeneral() const { return reading.IsGiven() || audience || recipient; }
};

/** The one of the trusted certificates with which alone `verify` succeeds. */
template <class Verify>
Quillon::Ref<const Quillon::Crypto::Certificate> FindSigner(
    const CertificateList& trusted, const Verify& verify)
{
    for (const auto& certificate : trusted) {
        try {
            verify(CertificateList{certificate});
            return certificate;
        } catch (const SsoClient::InvalidSignatureException&) {
            continue;
        }
    }
    return {};
}

/** Where the page goes; looked up before anything is read. */
std::unique_ptr<PageWriter> OpenPage(const InspectOptions& options)
{
    return options.pageFile.empty() ? nullptr : std::make_unique<PageWriter>(options.pageFile);
}

/** Called when everything is read that is needed, and before the first look at it. */
void ConfineInspection(const InspectOptions& options)
{
    // A store of keys, such as a smart card's, may have to ask somebody for each decryption.
    const std::string why = options.reading.decryptionKeys.AreInStores()
                                ? "the decryption key is in a store"
                                : Confine();
    if (!why.empty() && options.verbose) {
        Notice("the token is read without a filter of system calls: " + why);
    }
}

SsoClient::AssertionRules MakeRules(const InspectOptions& options)
{
    SsoClient::AssertionRules rules;
    rules.clockToleranceSec = options.clockToleranceSec;
    rules.decryptionKeys = options.reading.decryptionKeys.Get();
    if (options.audience) {
        rules.audience = *options.audience;
    }
    if (options.recipient) {
        rules.recipient = *options.recipient;
    }
    return rules;
}

boost::shared_ptr<const SsoClient::SamlToken> ReadDefaultToken(
    const std::string& text, const CertificateList& trusted, const InspectOptions& options)
{
    try {
        return SsoClient::CreateSamlToken(text, trusted, options.clockToleranceSec);
    } catch (const Quillon::Exception&) {
        if (options.verbose) {
            NoteGeneralReading(text, trusted, options.clockToleranceSec);
        }
        throw;
    }
}

Quillon::Ref<const Quillon::Crypto::Certificate> FindAssertionSigner(
    const std::string& text, const CertificateList& trusted, const SsoClient::AssertionRules& rules)
{
    return FindSigner(trusted, [&](const CertificateList& candidate) {
        SsoClient::VerifyAssertion(text, candidate, rules);
    });
}

/** Shows every fact, or the token that is made of them if it is said who its subject is. */
ExitCode InspectGeneral(
    const InspectOptions& options, const Presentation& presentation, std::string& text)
{
    const std::unique_ptr<PageWriter> page = OpenPage(options);
    const CertificateList trusted = ReadCertificates(options.trustFiles);
    text = ReadFile(options.file);
    const SsoClient::AssertionRules rules = MakeRules(options);
    ConfineInspection(options);
    const auto assertion = SsoClient::VerifyAssertion(text, trusted, rules);
    // Before anything is shown: the assertion may expire in between.
    const auto signer = page ? FindAssertionSigner(text, trusted, rules) : nullptr;
    if (!options.reading.subjects.empty()) {
        SsoClient::TokenReading reading;
        options.reading.ApplyTo(reading);
        TokenOutput({}, presentation).Show(SsoClient::CreateSamlToken(assertion, reading.mapping));
    } else if (!presentation.quiet) {
        TokenOutput::Print(
            presentation.json ? DescribeAsJson(*assertion) : DescribeAsLines(*assertion));
    }
    if (page) {
        page->Write(WriteAssertionPage(*assertion, signer.get()));
    }
    return ExitCode::DONE;
}

Quillon::Ref<const Quillon::Crypto::Certificate> FindTokenSigner(
    const SsoClient::SamlToken& token,
    const CertificateList& trusted,
    const InspectOptions& options)
{
    return FindSigner(trusted, [&](const CertificateList& candidate) {
        SsoClient::CreateSamlToken(token.ToXml(), candidate, options.clockToleranceSec);
    });
}

/** @param text  receives what the file holds, once it is read. */
ExitCode Inspect(const InspectOptions& options, const Presentation& presentation, std::string& text)
{
    if (options.IsGeneral()) {
        return InspectGeneral(options, presentation, text);
    }
    TokenOutput output({}, presentation);
    const std::unique_ptr<PageWriter> page = OpenPage(options);
    const CertificateList trusted = ReadCertificates(options.trustFiles);
    text = ReadFile(options.file);
    ConfineInspection(options);
    const auto token = ReadDefaultToken(text, trusted, options);
    // Before anything is shown: the token may expire in between.
    const bool needsSigner = page || presentation.ShowsExplanations();
    const auto signer = needsSigner ? FindTokenSigner(*token, trusted, options) : nullptr;
    output.Show(token);
    if (page) {
        page->Write(WriteTokenPage(*token, signer.get()));
    }
    if (presentation.ShowsExplanations()) {
        output.Print(Explain(*token, signer.get()));
    }
    return ExitCode::DONE;
}

void AddGeneralOptions(const Command& command, InspectOptions& options)
{
    options.reading.AddTo(command);
    const Command general = command.InGroup("Other services");
    general.AddOption("--audience", options.audience, "The audience that must be named")
        .Check(CheckNotEmptyText)
        .ValueName("URI");
    general.AddOption("--recipient", options.recipient, "The recipient that must be named")
        .Check(CheckNotEmptyText)
        .ValueName("URI");
}

/** A failure leaves the passage of the file that it is about. */
ExitCode InspectAndFindPassage(const InspectOptions& options, Invocation& invocation)
{
    std::string text;
    try {
        return Inspect(options, invocation.presentation, text);
    } catch (const Quillon::Exception& error) {
        invocation.passage = FindPassage(error.what(), text);
        throw;
    }
}

} // namespace

void AddInspectCommand(const Command& parent, Invocation& invocation)
{
    const Command command = parent.AddCommand("inspect", "Verify a token file and describe it");
    const auto options = std::make_shared<InspectOptions>();
    command.AddOption("FILE", options->file, "The token, - for standard input")
        .Required()
        .Check(CheckNotEmpty)
        .ValueName("");
    AddProfileTo(command);
    AddTrustTo(command, options->trustFiles).Required();
    command
        .AddOption(
            "--clock-tolerance",
            options->clockToleranceSec,
            "By how many seconds the token's validity is widened at both ends")
        .Between(0, MaxSeconds)
        .ShowDefault()
        .ValueName("SEC");
    command
        .AddOption("--html", options->pageFile, "Write what the token means as a page to this file")
        .Check(CheckNotEmpty)
        .ValueName("FILE");
    AddGeneralOptions(command, *options);
    command.AddFlag(
        "--verbose",
        options->verbose,
        "Say of a token that is refused whether it would be read with --general");
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient inspect token.xml --trust sts.pem");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return InspectAndFindPassage(*options, invocation);
        };
    });
}
