#pragma once

#include "quillon/Exceptions.h"

namespace Quillon::Xml::Security {

/** A signature uses something outside the accepted profile, or no trusted key fits it. */
class QUILLON_API XmlSecurityException : public ExceptionOf<XmlSecurityException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~XmlSecurityException() override;
};

/** A `ds:Signature` element is not built as XML Signature says [XMLDSIG 4]. */
class QUILLON_API SignatureSyntaxException : public ExceptionOf<SignatureSyntaxException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~SignatureSyntaxException() override;
};

} // namespace Quillon::Xml::Security
