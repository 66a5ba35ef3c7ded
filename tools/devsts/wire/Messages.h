#pragma once

#include <map>
#include <string>
#include <strings.h>

namespace DevSts {

struct IgnoreCase
{
    bool operator()(const std::string& left, const std::string& right) const
    {
        return strcasecmp(left.c_str(), right.c_str()) < 0;
    }
};

/** Names compare without regard to letter case. */
using Headers = std::multimap<std::string, std::string, IgnoreCase>;

struct ReceivedRequest
{
    std::string method;
    std::string path;
    Headers headers;
    std::string body;
};

struct Reply
{
    int status = 200;
    std::string contentType = "text/xml";
    Headers headers; ///< besides Content-Type and Content-Length
    std::string body;
};

} // namespace DevSts
