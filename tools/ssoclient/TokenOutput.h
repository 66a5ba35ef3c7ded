#pragma once

#include "CommandLine.h"
#include "Files.h"
#include "Presentation.h"

#include "ssoClient/SamlToken.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <optional>
#include <string>

/** Where a command that obtains a token puts it. */
struct OutputOptions
{
    bool obtains = false; ///< whether the command obtains a token, which it may keep
    std::string outFile;  ///< `-` is standard output

    void AddOutTo(const Command& command);
};

/** Shows tokens as the options and the presentation say. Made before a token is asked for: see
 * `OutputFile`. */
class TokenOutput
{
public:
    TokenOutput(const OutputOptions& options, const Presentation& presentation);

    /**
     * Writes the assertion to where `--out` says, and then the redacted description or the facts as
     * JSON to standard output, or to standard error where the assertion has gone there. Says at a
     * terminal that a token which was obtained is not kept.
     *
     * @throws SsoException  there is no token: the service answered with an empty one.
     */
    void Show(const boost::shared_ptr<const SsoClient::SamlToken>& token);

    /** Writes `text` to standard output. @throws UsageError  it cannot be written. */
    static void Print(const std::string& text);

private:
    bool ToStandardOutput() const;
    void Describe(const SsoClient::SamlToken& token) const;

    OutputOptions _options;
    Presentation _presentation;
    std::optional<OutputFile> _file;
};

/** Says whether the service stands by a token. @throws UsageError  it cannot be written. */
void ShowValidity(bool isValid, const Presentation& presentation);
