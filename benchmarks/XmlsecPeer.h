#pragma once

#include <memory>
#include <string>

namespace Benchmarks {

/**
 * Verifies the signature of an assertion with xmlsec1 in its best use: the key is loaded once, and
 * the ID is registered rather than searched for. It reads no token and makes no other check.
 */
class XmlsecPeer
{
public:
    explicit XmlsecPeer(const std::string& certificatePem);
    ~XmlsecPeer();
    XmlsecPeer(const XmlsecPeer&) = delete;
    XmlsecPeer& operator=(const XmlsecPeer&) = delete;

    /** @return whether the signature is right. */
    bool Run(const std::string& xml) const;

private:
    struct Key;
    std::unique_ptr<Key> _key;
};

} // namespace Benchmarks
