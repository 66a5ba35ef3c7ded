#pragma once

#include "ssoClient/Assertion.h"

#include <iosfwd>
#include <string>
#include <vector>

/** The assertions of the test data and what must come of them. */
namespace AssertionTable {

using Certificates = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

/** One document. */
struct Row
{
    std::string folder; ///< of the test data
    std::string file;
    std::string about;
    SsoClient::AssertionRules rules;
    std::string facts;     ///< of an accepted one, as `DescribeFacts` gives them
    std::string className; ///< of a refused one
    std::string contains;
};

std::ostream& operator<<(std::ostream& out, const Row& row);

const std::vector<Row>& GetRows();
const Row& GetRow(const std::string& file);

/** The time at which all are judged. */
const std::string& GetNow();

/** The certificates that are trusted for all of them. */
const Certificates& GetTrusted();

std::string Read(const Row& row);

/** Everything that an assertion says, as indented JSON. */
std::string DescribeFacts(const SsoClient::VerifiedAssertion& assertion);

/** Verifies one of the files by the rules of its row, at the table's time. */
boost::shared_ptr<const SsoClient::VerifiedAssertion> Verify(const Row& row);
boost::shared_ptr<const SsoClient::VerifiedAssertion> Verify(
    const std::string& xml, const SsoClient::AssertionRules& rules);

} // namespace AssertionTable
