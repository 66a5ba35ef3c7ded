#pragma once

#include "ssoClient/Assertion.h"
#include "ssoClient/Export.h"
#include "ssoClient/SubjectMapping.h"

#include <boost/optional.hpp>

#include <string>
#include <vector>

/**
 * How a token service wants to be spoken to. WS-Trust leaves much open, and services differ in what
 * they understand, demand and answer. A dialect says all of it in one value that the writer of
 * requests and the reader of replies go by. Nothing of it depends on which service it is.
 */
namespace SsoClient {

enum class SoapVersion
{
    SOAP_1_1,
    /** Its replies come with status 400, too, if they are faults [SOAP12-2 7.5.1.2]. */
    SOAP_1_2
};

enum class TrustVersion
{
    WS_TRUST_1_3,
    /** The draft of February 2005, for issuing only. */
    WS_TRUST_2005_02
};

/** How `TokenSpec::audienceRestriction` is asked for. */
enum class AudienceForm
{
    PARTICIPANTS, ///< `wst:Participants` with each of them
    APPLIES_TO    ///< `wsp:AppliesTo` with the only one; several are a bad argument
};

/** What stands in `wst:UseKey`, which says what key a holder-of-key token is to be bound to. */
enum class UseKeyForm
{
    EMPTY,       ///< nothing; its `Sig` attribute names the signature of the request
    CERTIFICATE, ///< the certificate itself
    REFERENCE    ///< a reference to the certificate or the token in the security header
};

/** Where the token stands that `AcquireTokenByToken` presents, and what it is for. */
enum class PresentedTokenForm
{
    /** In the security header, where it proves who asks; the signature names it. */
    IN_HEADER,
    /** In the body: the caller asks for a token of the presented token's subject. */
    ON_BEHALF_OF,
    /** In the body: the caller asks for a token with which to act as that subject [WST14 9.1]. */
    ACT_AS
};

/** What the signature of a request covers. */
enum class SignatureScope
{
    MESSAGE, ///< the SOAP body, the timestamp and the WS-Addressing headers
    /**
     * The timestamp and `wsa:To`, where TLS protects the message and the signature only shows
     * whose request it is. Such services often refuse a signature over more.
     */
    TIMESTAMP_AND_TO
};

/** A claim that is asked for, by its URI. */
struct RequestedClaim
{
    std::string uri;
    bool isOptional = false; ///< a token without it will do
};

/**
 * How the token of a reply is read, if not in the narrow way of `CreateSamlToken(xml, ...)`. With
 * decryption keys in the rules it may be encrypted, but for one that a negotiation leads to.
 */
struct TokenReading
{
    AssertionRules rules;
    SubjectMapping mapping;
};

/**
 * What of an issued token is compared with what was asked for. A token that differs is refused with
 * an `SsoException` that says how. Each part can be switched off for services that cannot do
 * better.
 */
struct GrantCheck
{
    /** Bound to the caller's key if that was asked for, and to none if not. */
    bool key = true;
    /**
     * Of the one who authenticated, or whose token was presented. Not compared: persistent and
     * transient names, e-mail addresses, and names in a domain that the mapping gives, unless the
     * mapping is of one directory; and whoever acts as somebody.
     */
    bool subject = true;
    /** For the audience that was asked for, no more and no less; renewed: as before. */
    bool audience = true;
    /** Delegated to whom was asked for and to nobody else, and delegable only if that was. */
    bool delegation = true;
    /** Not longer than asked for, and the clock tolerance of `reading`. */
    bool lifetime = true;
};

/**
 * A value with a member for each difference that is known. A default one is the dialect of the
 * service that the library was made for: without a dialect in the configuration, requests and
 * replies are the same.
 */
struct ServiceDialect
{
    SoapVersion soap = SoapVersion::SOAP_1_1;
    TrustVersion trust = TrustVersion::WS_TRUST_1_3;

    /**
     * Whether requests have the WS-Addressing headers Action, MessageID, ReplyTo (anonymous) and To
     * (the URL of the service) [WSA-SOAP 3].
     */
    bool addressing = false;
    SignatureScope signatureScope = SignatureScope::MESSAGE;

    AudienceForm audienceForm = AudienceForm::PARTICIPANTS;

    /** Asked for with every issue request, in the dialect of identity claims. */
    std::vector<RequestedClaim> claims;

    /** Whether `wst:Delegatable` and `wst:Renewing` are written when they say no, too. */
    bool writesFalseDelegatable = true;
    bool writesFalseRenewing = true;

    UseKeyForm useKey = UseKeyForm::EMPTY;
    /** Whether `wst:UseKey` also stands in a request that presents a token in the header. */
    bool useKeyWithPresentedToken = false;

    /**
     * Whether the token type of the reference to a SAML token in the header is written with
     * `saml-token-profile`, as BSP R6617 demands, instead of `saml-tokenprofile`.
     */
    bool hyphenInSamlTokenType = false;

    PresentedTokenForm presentedToken = PresentedTokenForm::IN_HEADER;

    /**
     * Whether validation requests say who asks: with the user name and password of the
     * configuration or, without these, with the signature of the holder-of-key identity.
     */
    bool validatesWithCredentials = false;

    /** Whether issue and renew replies may come with a collection as well as without. */
    bool anyReplyForm = false;

    /** Whether the fault `wsse:FailedAuthentication` is an `InvalidCredentialsException`. */
    bool wsseFailedAuthentication = false;

    boost::optional<TokenReading> reading;
    GrantCheck grantCheck;

    /** What the library speaks without a dialect. */
    static ServiceDialect Default() { return {}; }

    /**
     * Apache CXF's STS with its stock settings: SOAP 1.1, what its parser knows, and its own
     * assertions. The qualifier of its name identifiers, `http://cxf.apache.org/sts`, is the domain
     * of its users.
     */
    SSOCLIENT_API static ServiceDialect ApacheCxf();

    /**
     * Active Directory Federation Services at its endpoints `usernamemixed`, `certificatemixed` and
     * `issuedtokenmixed...`, those below `/trust/13/` and those below `/trust/2005/`. Their users
     * are read from the UPN claim, which the relying party's rules must issue.
     */
    SSOCLIENT_API static ServiceDialect AdFs13();
    SSOCLIENT_API static ServiceDialect AdFs2005();
};

} // namespace SsoClient
