#pragma once

#include "quillon/Exceptions.h"
#include "ssoClient/Export.h"

/**
 * The failures that the library reports. Catch the most derived classes first. A bad argument is
 * a `Quillon::InvalidArgumentException`, a missing configuration a
 * `Quillon::InvalidStateException`; text that is not XML a `Quillon::Xml::XMLParseException`.
 */
namespace SsoClient {

/**
 * Any failure of a token-service operation or of token handling. The text repeats a reply's fault
 * code or token type as it is, of whatever length.
 */
class SSOCLIENT_API SsoException : public Quillon::ExceptionOf<SsoException, Quillon::Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~SsoException() override;
};

/** A token is unacceptable. */
class SSOCLIENT_API InvalidTokenException
    : public Quillon::ExceptionOf<InvalidTokenException, SsoException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~InvalidTokenException() override;
};

/**
 * Token or response XML does not have the required structure or values, or has expired. The text
 * repeats values of the document as they are: it may have as many bytes as the document, and line
 * breaks. Cut it before it is logged.
 */
class SSOCLIENT_API ParseException
    : public Quillon::ExceptionOf<ParseException, InvalidTokenException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~ParseException() override;
};

/** A token's signature does not verify against the trusted certificates. */
class SSOCLIENT_API InvalidSignatureException
    : public Quillon::ExceptionOf<InvalidSignatureException, InvalidTokenException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~InvalidSignatureException() override;
};

/** The token service could not be reached or answered outside the protocol. */
class SSOCLIENT_API CommunicationException
    : public Quillon::ExceptionOf<CommunicationException, SsoException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~CommunicationException() override;
};

/** The token service rejected the presented credentials. The text repeats its fault string. */
class SSOCLIENT_API InvalidCredentialsException
    : public Quillon::ExceptionOf<InvalidCredentialsException, SsoException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~InvalidCredentialsException() override;
};

/** The caller has called the operation off; see `CancellationSource`. */
class SSOCLIENT_API CancelledException
    : public Quillon::ExceptionOf<CancelledException, SsoException>
{
public:
    using ExceptionOf::ExceptionOf;
    ~CancelledException() override;
};

} // namespace SsoClient
