#include "Arguments.h"
#include "Commands.h"
#include "Explanation.h"
#include "Files.h"
#include "Profile.h"
#include "TokenOutput.h"
#include "TokenPage.h"
#include "Trust.h"

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
    long long clockToleranceSec = SsoClient::DefaultClockToleranceSec;
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

ExitCode Inspect(const InspectOptions& options, const Presentation& presentation)
{
    TokenOutput output({}, presentation);
    std::optional<OutputFile> page;
    if (!options.pageFile.empty()) {
        page.emplace(options.pageFile);
    }
    const CertificateList trusted = ReadCertificates(options.trustFiles);
    const auto token =
        SsoClient::CreateSamlToken(ReadFile(options.file), trusted, options.clockToleranceSec);
    output.Show(token);
    if (!page && !presentation.ShowsExplanations()) {
        return ExitCode::DONE;
    }
    const auto signer = FindSigner(*token, trusted, options.clockToleranceSec);
    if (page) {
        page->Write(WriteTokenPage(*token, signer.get()));
    }
    if (presentation.ShowsExplanations()) {
        output.Print(Explain(*token, signer.get()));
    }
    return ExitCode::DONE;
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
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient inspect token.xml --trust sts.pem");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return Inspect(*options, invocation.presentation);
        };
    });
}
