#include "Ledger.h"

#include <functional>

namespace Soak {

namespace {

/** Far more than there are tokens in an hour. */
constexpr std::size_t Places = 1U << 23U;

constexpr std::size_t MostProblems = 20;

} // namespace

Ledger::Ledger()
    : _ids(Places)
{
    _problems.reserve(MostProblems);
}

void Ledger::NoteToken(const std::string& id, const std::string& subject, const std::string& asked)
{
    ++_tokens;
    if (subject != asked) {
        NoteProblem(asked + " was given a token of " + subject);
    }
    if (!IsNew(std::hash<std::string>()(id) | 1U)) {
        NoteProblem("a token twice: " + id);
    }
}

bool Ledger::IsNew(std::uint64_t hash)
{
    for (std::size_t place = hash / 2 % Places;; place = (place + 1) % Places) {
        std::uint64_t found = 0;
        if (_ids[place].compare_exchange_strong(found, hash)) {
            return true;
        }
        if (found == hash) {
            return false;
        }
    }
}

void Ledger::NoteFailure(const std::string& className)
{
    ++_failed;
    const std::lock_guard<std::mutex> lock(_mutex);
    ++_failures[className];
}

void Ledger::NoteProblem(const std::string& what)
{
    const std::lock_guard<std::mutex> lock(_mutex);
    if (_problems.size() < MostProblems) {
        _problems.push_back(what);
    }
}

std::string Ledger::DescribeFailures() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    std::string text;
    for (const auto& [name, count] : _failures) {
        text += (text.empty() ? "" : ", ") + std::to_string(count) + " " + name;
    }
    return text;
}

std::vector<std::string> Ledger::GetProblems() const
{
    const std::lock_guard<std::mutex> lock(_mutex);
    return _problems;
}

} // namespace Soak
