#pragma once

#include "CommandLine.h"

#include <map>
#include <string>
#include <vector>

/** Options that a file keeps under one name, so that nobody has to type them each time. */
struct Profile
{
    std::string name;
    std::string file; ///< that it stands in
    /** By the option's name without dashes; files with their whole path. */
    std::map<std::string, std::vector<std::string>> values;
};

/** `ssoclient/config.toml` below XDG_CONFIG_HOME, or below `.config` in HOME. @throws UsageError */
std::string GetProfileFile();

/**
 * Takes the profile `name` out of the text of `file`. What is relative there is so to its folder.
 *
 * @throws UsageError  the text is no TOML, has no such profile, or something in it that no profile
 *                     has. The text names file and line, and what was probably meant.
 */
Profile ParseProfile(const std::string& text, const std::string& file, const std::string& name);

/** The same from the file of the user who runs this. @throws UsageError  also, it cannot be read.
 */
Profile ReadProfile(const std::string& name);

/** Adds `--profile NAME` to the help; `AddProfile` does what it says. */
void AddProfileTo(const Command& command);

/**
 * The arguments with those of the profile that they name, if they do, for what they do not say
 * themselves.
 *
 * @param options  the names of the command's options, without dashes.
 * @throws UsageError  as `ReadProfile`.
 */
std::vector<std::string> AddProfile(
    const std::vector<std::string>& arguments, const std::vector<std::string>& options);
