#pragma once

#include "CommandLine.h"
#include "Files.h"

#include "ssoClient/SamlToken.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <optional>
#include <string>

/** How a command shows a token: `--json`, and `--out` where the command obtains one. */
struct OutputOptions
{
    bool json = false;
    bool obtains = false; ///< whether the command obtains a token, which it may keep
    std::string outFile;  ///< `-` is standard output

    void AddJsonTo(const Command& command);
    void AddOutTo(const Command& command);
};

/** Shows tokens as the options say. Made before a token is asked for: see `OutputFile`. */
class TokenOutput
{
public:
    explicit TokenOutput(const OutputOptions& options);

    /**
     * Writes the assertion to where `--out` says, and then the redacted description or the facts as
     * JSON to standard output, or to standard error where the assertion has gone there. Says at a
     * terminal that a token which was obtained is not kept.
     *
     * @throws SsoException  there is no token: the service answered with an empty one.
     */
    void Show(const boost::shared_ptr<const SsoClient::SamlToken>& token);

private:
    bool ToStandardOutput() const;
    void Describe(const SsoClient::SamlToken& token) const;

    OutputOptions _options;
    std::optional<OutputFile> _file;
};

/** Writes `line` and a line break to standard output. @throws UsageError  it cannot be written. */
void PrintLine(const std::string& line);
