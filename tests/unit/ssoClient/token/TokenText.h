#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/system/Clock.h"
#include "ssoClient/SamlToken.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <list>
#include <memory>
#include <string>
#include <vector>

struct evp_pkey_st;

/**
 * Assertions for tests. They are written by hand in exclusive canonical form (with the prefix list
 * of the signature's transform), so that OpenSSL alone can sign them.
 */
namespace TokenText {

/** A bearer assertion without signature, valid at the time of `FixedClock`. */
std::string Bearer();

/** The same with a holder-of-key confirmation for `certificate`, which is Base64. */
std::string HolderOfKey(const std::string& certificate);

/** A NameID element as the assertions have it. */
std::string NameId(const std::string& value);

/** A delegation restriction of the given delegates, all at 2012-01-31T11:00:00Z. */
std::string DelegationRestriction(const std::vector<std::string>& delegates);

/** A `saml:Attribute` element. */
std::string Attribute(const std::string& name, const std::vector<std::string>& values);

/** Replaces the one place where `from` stands. @throws std::logic_error unless there is just one */
std::string Replace(const std::string& text, const std::string& from, const std::string& to);

/** Puts `inserted` before the one place where `where` stands. */
std::string InsertBefore(
    const std::string& text, const std::string& where, const std::string& inserted);

inline constexpr char EndOfConditions[] = "</saml:Conditions>";
inline constexpr char EndOfAssertion[] = "</saml:Assertion>";

/** A bearer assertion with `conditions` as the children of its Conditions. */
std::string WithConditions(const std::string& conditions);

/** A bearer assertion with a statement of `attributes`. */
std::string WithAttributes(const std::string& attributes);

/** Adds a signature that has the right form and the wrong values. */
std::string WithDummySignature(const std::string& assertion);

/** A fresh RSA-2048 key with a certificate that it signed itself. */
class SigningKey
{
public:
    SigningKey();

    const std::string& GetCertificateBase64() const { return _certificateBase64; }
    const Quillon::Ref<const Quillon::Crypto::Certificate>& GetCertificate() const
    {
        return _certificate;
    }

    /** Adds a signature by this key to an assertion that has none; `uri` is the reference's. */
    std::string Sign(const std::string& assertion, const std::string& uri = "#_token") const;

private:
    std::string SignValue(const std::string& text) const;

    std::shared_ptr<evp_pkey_st> _key;
    std::string _certificateBase64;
    Quillon::Ref<const Quillon::Crypto::Certificate> _certificate;
};

/** The key of the token service, made on first use. */
const SigningKey& StsKey();

/** The certificate of that key. */
std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> TrustSts();

/** The token of an assertion, signed with that key. */
boost::shared_ptr<const SsoClient::SamlToken> MakeToken(const std::string& assertion);

/** Sets the time of the process while it lives. */
class FixedClock final : public Quillon::System::Clock
{
public:
    explicit FixedClock(const std::string& time = "2012-01-31T12:00:00Z");
    ~FixedClock();
    FixedClock(const FixedClock&) = delete;
    FixedClock& operator=(const FixedClock&) = delete;

    Quillon::System::DateTime Now() const override { return _now; }

private:
    Quillon::System::DateTime _now;
};

/** Class and text of the exception with which `CreateSamlToken` refuses; "accepted" if none. */
std::string Judge(
    const std::string& xml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trusted = {},
    long long clockToleranceSec = 600);

/** The same for an assertion that still needs a (dummy) signature. */
std::string JudgeUnsigned(const std::string& assertion, long long clockToleranceSec = 600);

/** The same for a bearer assertion with `to` in the place of `from`. */
std::string JudgeReplaced(const std::string& from, const std::string& to);

/** The same for a bearer assertion with `conditions` in its Conditions. */
std::string JudgeConditions(const std::string& conditions);

/** What `Judge` says of a token that has nothing wrong but its signature, if nobody is trusted. */
inline constexpr char ReachesSignature[] =
    "InvalidSignatureException: Signature verification error. There are no trusted certificates";

} // namespace TokenText
