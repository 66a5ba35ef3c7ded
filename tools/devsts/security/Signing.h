#pragma once

#include <libxml/tree.h>
#include <memory>
#include <string>

namespace DevSts {

/** Starts xmlsec1 once for the process. @throws std::runtime_error */
void InitializeXmlSec();

/**
 * Signs assertions with xmlsec1.
 *
 * Thread safety: const; any number of threads.
 */
class Signer
{
public:
    /** @throws std::runtime_error  key or certificate cannot be read. */
    Signer(const std::string& keyPem, const std::string& certificatePem);
    ~Signer();

    Signer(const Signer&) = delete;
    Signer& operator=(const Signer&) = delete;

    /** Puts an enveloped signature after the Issuer of the root element, a saml:Assertion. */
    void SignAssertion(xmlDoc* assertion) const;

private:
    struct Key;
    std::unique_ptr<const Key> _key;
};

} // namespace DevSts
