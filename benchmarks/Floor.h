#pragma once

#include <memory>
#include <string>
#include <vector>

// The least that an operation can cost with the libraries that it stands on.
namespace Benchmarks {

/**
 * What no verification can do without: one parse, two passes of SHA-256, one RSA operation, all
 * with contexts that are made once. One thread at a time.
 */
class VerifyFloor
{
public:
    /** Makes an RSA-2048 key and a signature of its own. */
    VerifyFloor();
    ~VerifyFloor();
    VerifyFloor(const VerifyFloor&) = delete;
    VerifyFloor& operator=(const VerifyFloor&) = delete;

    /** @return false if anything failed, so that nothing is measured that does not work. */
    bool Run(const std::string& xml) const;

private:
    struct Handles;
    std::unique_ptr<Handles> _handles;
};

/** What no signing can do without: one RSA operation, with a context that is made once. */
class SignFloor
{
public:
    explicit SignFloor(const std::string& keyPem);
    ~SignFloor();
    SignFloor(const SignFloor&) = delete;
    SignFloor& operator=(const SignFloor&) = delete;

    /** @return false if it failed. */
    bool Run() const;

private:
    struct Handles;
    std::unique_ptr<Handles> _handles;
};

} // namespace Benchmarks
