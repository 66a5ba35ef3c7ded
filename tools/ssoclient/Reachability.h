#pragma once

#include "Finding.h"

#include <string>
#include <vector>

/**
 * Looks up `host` and connects to each of its addresses, as the library does before it sends.
 *
 * @param timeoutMs  for each connection.
 * @return what each step came to; the last is bad if no address can be connected to.
 */
std::vector<Finding> ExamineReachability(const std::string& host, int port, int timeoutMs);
