#include "xml/security/canonicalDigest.h"

namespace Quillon::Xml::Security {

namespace {

class DigestSink final : public ByteSink
{
public:
    explicit DigestSink(Crypto::HashAlgorithm algorithm)
        : _digest(algorithm)
    {}
    void Write(const char* bytes, std::size_t size) override { _digest.Update(bytes, size); }
    Crypto::DigestValue Finish() { return _digest.Finish(); }

private:
    Crypto::Digest _digest;
};

} // namespace

Crypto::DigestValue DigestElement(
    Crypto::HashAlgorithm hash,
    const CanonicalizationMethod& method,
    const ElementNode& apex,
    const Node* excluded)
{
    DigestSink sink(hash);
    OutputBuffer out(sink);
    Canonicalize(method, apex, excluded, out);
    out.Flush();
    return sink.Finish();
}

Crypto::DigestValue DigestDocument(
    Crypto::HashAlgorithm hash,
    const CanonicalizationMethod& method,
    const Node* first,
    const Node* excluded)
{
    DigestSink sink(hash);
    OutputBuffer out(sink);
    CanonicalizeDocument(method, first, excluded, out);
    out.Flush();
    return sink.Finish();
}

} // namespace Quillon::Xml::Security
