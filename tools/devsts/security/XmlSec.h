#pragma once

#include "devsts/wire/Xml.h"

#include <memory>
#include <xmlsec/xmlsec.h>
// xmlsec's headers want xmlsec.h first.
#include <xmlsec/keys.h>
#include <xmlsec/xmldsig.h>

namespace DevSts {

struct XmlSecDeleter
{
    void operator()(xmlSecKey* key) const { xmlSecKeyDestroy(key); }
    void operator()(xmlSecDSigCtx* context) const { xmlSecDSigCtxDestroy(context); }
};
using SecKey = std::unique_ptr<xmlSecKey, XmlSecDeleter>;
using SecSignature = std::unique_ptr<xmlSecDSigCtx, XmlSecDeleter>;

/**
 * Makes the attribute an ID of the document, so that references find the element.
 *
 * @throws ShapeError  there is no such attribute, or its value names another element already, or
 *                     has other characters than letters, digits, '_', '-' and '.'.
 */
std::string RegisterId(xmlNode* element, const XmlName& name);

} // namespace DevSts
