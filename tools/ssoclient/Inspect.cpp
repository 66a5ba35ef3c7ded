#include "Arguments.h"
#include "Commands.h"
#include "Files.h"
#include "TokenOutput.h"
#include "Trust.h"

#include "ssoClient/CreateSamlToken.h"

#include <CLI/Validators.hpp>

#include <memory>

namespace {

struct InspectOptions
{
    OutputOptions output;
    std::string file;
    std::vector<std::string> trustFiles;
    long long clockToleranceSec = SsoClient::DefaultClockToleranceSec;
};

ExitCode Inspect(const InspectOptions& options)
{
    TokenOutput output(options.output);
    const CertificateList trusted = ReadCertificates(options.trustFiles);
    output.Show(
        SsoClient::CreateSamlToken(ReadFile(options.file), trusted, options.clockToleranceSec));
    return ExitCode::DONE;
}

} // namespace

void AddInspectCommand(CLI::App& parent, Action& action)
{
    CLI::App* command = parent.add_subcommand("inspect", "Verify a token file and describe it");
    const auto options = std::make_shared<InspectOptions>();
    command->add_option("FILE", options->file, "The token, - for standard input")
        ->required()
        ->check(CheckNotEmpty)
        ->type_name("");
    AddTrustTo(*command, options->trustFiles);
    command
        ->add_option(
            "--clock-tolerance",
            options->clockToleranceSec,
            "By how many seconds the token's validity is widened at both ends")
        ->check(CLI::Range(0LL, MaxSeconds))
        ->capture_default_str()
        ->type_name("SEC");
    options->output.AddJsonTo(*command);
    command->callback([options, &action] { action = [options] { return Inspect(*options); }; });
}
