#ifndef DEVSTS_REPLY_WRITER_H
#define DEVSTS_REPLY_WRITER_H

#include "devsts/Request.h"

#include <string>

namespace DevSts {

/** The answer to Issue: a collection with one response. [WST13 4.3] */
std::string WriteIssueReply(const xmlDoc* assertion, const Interval& lifetime);

} // namespace DevSts

#endif
