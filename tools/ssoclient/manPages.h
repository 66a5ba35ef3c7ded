#pragma once

#include "CommandDescription.h"

#include <map>
#include <string>

/**
 * A manual page for the program and for each of its commands, by the name of its file.
 *
 * @param version  of the program.
 */
std::map<std::string, std::string> WriteManPages(
    const CommandDescription& program, const std::string& version);
