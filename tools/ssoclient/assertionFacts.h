#pragma once

#include "ssoClient/Assertion.h"

#include <string>

/** Every fact of an assertion as JSON of ASCII alone, under the names of `AssertionFacts`. */
std::string DescribeAsJson(const SsoClient::VerifiedAssertion& assertion);

/** The same as lines `path: value`, one for each fact that is there. */
std::string DescribeAsLines(const SsoClient::VerifiedAssertion& assertion);
