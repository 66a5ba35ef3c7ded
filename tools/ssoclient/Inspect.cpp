#include "Arguments.h"
#include "Commands.h"
#include "DialectOptions.h"
#include "ExitCode.h"
#include "Explanation.h"
#include "Files.h"
#include "GeneralReading.h"
#include "Profile.h"
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

/** The one of the trusted certificates that the token verifies with by itself. */
Quillon::Ref<const Quillon::Crypto::Certificate> FindSigner(
    const SsoClient::SamlToken& token, const CertificateList& trusted, long long clockToleranceSec)
{
    for (const auto& certificate : trusted) {
        try {
            SsoClient::CreateSamlToken(token.ToXml(), {certificate}, clockToleranceSec);
            return certificate;
        } catch (const SsoClient::InvalidSignatureException&) {
            continue;
        }
    }
    return {};
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

/** Shows every fact, or the token that is made of them if it is said who its subject is. */
ExitCode InspectGeneral(
    const InspectOptions& options, const Presentation& presentation, std::string& text)
{
    if (!options.pageFile.empty()) {
        throw UsageError("--html shows tokens of the default kind, not general assertions");
    }
    const CertificateList trusted = ReadCertificates(options.trustFiles);
    text = ReadFile(options.file);
    const auto assertion = SsoClient::VerifyAssertion(text, trusted, MakeRules(options));
    if (!options.reading.subjects.empty()) {
        SsoClient::TokenReading reading;
        options.reading.ApplyTo(reading);
        TokenOutput({}, presentation).Show(SsoClient::CreateSamlToken(assertion, reading.mapping));
    } else if (!presentation.quiet) {
        TokenOutput::Print(
            presentation.json ? DescribeAsJson(*assertion) : DescribeAsLines(*assertion));
    }
    return ExitCode::DONE;
}

/** @param text  receives what the file holds, once it is read. */
ExitCode Inspect(const InspectOptions& options, const Presentation& presentation, std::string& text)
{
    if (options.IsGeneral()) {
        return InspectGeneral(options, presentation, text);
    }
    TokenOutput output({}, presentation);
    std::optional<OutputFile> page;
    if (!options.pageFile.empty()) {
        page.emplace(options.pageFile);
    }
    const CertificateList trusted = ReadCertificates(options.trustFiles);
    text = ReadFile(options.file);
    const auto token = ReadDefaultToken(text, trusted, options);
    // Before anything is shown: the token may expire in between.
    const bool needsSigner = page || presentation.ShowsExplanations();
    const auto signer =
        needsSigner ? FindSigner(*token, trusted, options.clockToleranceSec) : nullptr;
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
