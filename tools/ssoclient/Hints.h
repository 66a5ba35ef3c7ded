#pragma once

#include <exception>
#include <string>

/** What a person can do about a failure; empty if nothing is known to help. */
std::string FindHint(const std::exception& error);
