#pragma once

#include <array>
#include <atomic>
#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <vector>

namespace Soak {

/**
 * What was asked for and what came of it. Each operation is entered when it begins and when it
 * ends, each token by its id, which no other may have.
 *
 * Thread safety: any thread. Its memory is taken when it is made, so that it does not grow.
 */
class Ledger
{
public:
    Ledger();

    void Begin() { ++_begun; }
    void NoteToken(const std::string& id, const std::string& subject, const std::string& asked);
    void NoteSuccess() { ++_succeeded; }
    void NoteFailure(const std::string& className);

    /** Something that must not be. The first few are kept. */
    void NoteProblem(const std::string& what);

    unsigned long CountBegun() const { return _begun; }
    unsigned long CountSucceeded() const { return _succeeded; }
    unsigned long CountTokens() const { return _tokens; }
    bool IsBalanced() const { return _begun == _succeeded + _failed; }

    /** One line on what failed, and one for each problem. */
    std::string DescribeFailures() const;
    std::vector<std::string> GetProblems() const;

private:
    bool IsNew(std::uint64_t hash);

    std::atomic<unsigned long> _begun{0};
    std::atomic<unsigned long> _succeeded{0};
    std::atomic<unsigned long> _failed{0};
    std::atomic<unsigned long> _tokens{0};
    std::vector<std::atomic<std::uint64_t>> _ids;
    mutable std::mutex _mutex;
    std::map<std::string, unsigned long> _failures;
    std::vector<std::string> _problems;
};

} // namespace Soak
