#pragma once

#include "devsts/wire/Request.h"

#include <string>

namespace DevSts {

/**
 * The signature of a request over its Body and its Timestamp. It names its key either by a
 * binary security token in the same header or by the assertion there.
 */
class MessageSignature
{
public:
    /** `request` has a signature and outlives this. @throws Fault  it is malformed. */
    explicit MessageSignature(const Request& request);

    /** Empty if it has none. */
    const std::string& Id() const { return _id; }

    /** The same for every copy of one message, and for no other. */
    const std::string& Value() const { return _value; }

    /** Tells the signed Timestamp and Body, whoever signed them. */
    const std::string& Digests() const { return _digests; }

    /** The certificate in the header that it names. @throws Fault  it names none. */
    std::string NamedCertificate() const;

    /** @throws Fault  it does not name the assertion with this ID. */
    void RequireNamesAssertion(const std::string& id) const;

    bool IsMadeBy(const std::string& certificateDer) const;

    /** @throws Fault  the key of that certificate did not sign, or not this message. */
    void RequireMadeBy(const std::string& certificateDer) const;

private:
    const Request& _request;
    std::string _id;
    std::string _value;
    std::string _digests;
    xmlNode* _reference = nullptr; ///< the wsse:SecurityTokenReference
};

} // namespace DevSts
