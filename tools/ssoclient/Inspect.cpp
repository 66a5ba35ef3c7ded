#include "Arguments.h"
#include "Commands.h"
#include "Files.h"
#include "TokenOutput.h"
#include "Trust.h"

#include "ssoClient/CreateSamlToken.h"

#include <memory>

namespace {

struct InspectOptions
{
    std::string file;
    std::vector<std::string> trustFiles;
    long long clockToleranceSec = SsoClient::DefaultClockToleranceSec;
};

ExitCode Inspect(const InspectOptions& options, const Presentation& presentation)
{
    TokenOutput output({}, presentation);
    const CertificateList trusted = ReadCertificates(options.trustFiles);
    output.Show(
        SsoClient::CreateSamlToken(ReadFile(options.file), trusted, options.clockToleranceSec));
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
    AddTrustTo(command, options->trustFiles);
    command
        .AddOption(
            "--clock-tolerance",
            options->clockToleranceSec,
            "By how many seconds the token's validity is widened at both ends")
        .Between(0, MaxSeconds)
        .ShowDefault()
        .ValueName("SEC");
    invocation.presentation.AddTo(command);
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            return Inspect(*options, invocation.presentation);
        };
    });
}
