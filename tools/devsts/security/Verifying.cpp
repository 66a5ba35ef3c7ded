#include "devsts/security/Verifying.h"

#include "devsts/security/XmlSec.h"

#include <xmlsec/openssl/app.h>
#include <xmlsec/openssl/crypto.h>

namespace DevSts {

namespace {

bool Enable(xmlSecDSigCtx* context)
{
    context->enabledReferenceUris = xmlSecTransformUriTypeSameDocument;
    return xmlSecDSigCtxEnableSignatureTransform(context, xmlSecTransformExclC14NId) == 0
           && xmlSecDSigCtxEnableSignatureTransform(context, xmlSecOpenSSLTransformRsaSha256Id) == 0
           && xmlSecDSigCtxEnableReferenceTransform(context, xmlSecTransformEnvelopedId) == 0
           && xmlSecDSigCtxEnableReferenceTransform(context, xmlSecTransformExclC14NId) == 0
           && xmlSecDSigCtxEnableReferenceTransform(context, xmlSecOpenSSLTransformSha256Id) == 0;
}

} // namespace

bool VerifySignature(xmlNode* signature, const std::string& certificateDer)
{
    SecKey key(xmlSecOpenSSLAppKeyLoadMemory(
        reinterpret_cast<const xmlSecByte*>(certificateDer.data()),
        static_cast<xmlSecSize>(certificateDer.size()),
        xmlSecKeyDataFormatCertDer,
        nullptr,
        nullptr,
        nullptr));
    const SecSignature context(xmlSecDSigCtxCreate(nullptr));
    if (key == nullptr || context == nullptr || !Enable(context.get())) {
        return false;
    }
    // With a key in place xmlsec1 does not search KeyInfo for another. The context frees it.
    context->signKey = key.release();
    return xmlSecDSigCtxVerify(context.get(), signature) == 0
           && context->status == xmlSecDSigStatusSucceeded;
}

} // namespace DevSts
