#include "devsts/misbehaviour/Identities.h"

#include <algorithm>
#include <functional>
#include <map>
#include <stdexcept>

namespace DevSts {

namespace {

constexpr const char* ServerName = "SsoClient misbehaving STS (TLS)";
constexpr const char* LongAgo = "20010101000000Z";
constexpr const char* FarAhead = "20450101000000Z";
constexpr const char* NoAuthority = "critical,CA:FALSE";

PrivateKey MakeKey(EVP_PKEY* key)
{
    if (key == nullptr) {
        throw std::runtime_error("A key of this kind cannot be made");
    }
    return PrivateKey(key);
}

/** Somebody who signs certificates. */
struct Authority
{
    PrivateKey key;
    Certificate certificate;
};

/** Makes chains below the authority of a state directory. */
class Issuer
{
public:
    Issuer(const State& state, std::string names)
        : _root{
            PrivateKeyFromPem(ReadFile(state.Dir() / "ca.key")),
            CertificateFromPem(ReadFile(state.Dir() / "ca.pem"))}
        , _names(std::move(names))
    {}

    CertificateSpec ServerSpec() const
    {
        CertificateSpec spec;
        spec.commonName = ServerName;
        spec.alternativeNames = _names;
        return spec;
    }

    static CertificateSpec AuthoritySpec(const std::string& name = "intermediate")
    {
        CertificateSpec spec;
        spec.commonName = name;
        spec.isAuthority = true;
        return spec;
    }

    /** A server directly below the root. */
    ShownIdentity Issue(const CertificateSpec& spec, PrivateKey key = GenerateEcKey()) const
    {
        return IssueBelow(_root, spec, std::move(key));
    }

    /** A server of honest looks below an authority that nobody has to trust. */
    ShownIdentity IssueBelow(const Authority& authority) const
    {
        return IssueBelow(authority, ServerSpec(), GenerateEcKey());
    }

    /** A server below authorities of these specs, the first of them below the root. */
    ShownIdentity IssueThrough(
        const std::vector<CertificateSpec>& specs,
        const CertificateSpec& own,
        PrivateKey (*makeKey)() = &GenerateEcKey) const
    {
        const Authority* above = &_root;
        std::vector<Authority> authorities;
        authorities.reserve(specs.size());
        for (const CertificateSpec& spec : specs) {
            PrivateKey key = makeKey();
            Certificate certificate =
                MakeSigned(spec, key.get(), above->certificate.get(), above->key.get());
            authorities.push_back({std::move(key), std::move(certificate)});
            above = &authorities.back();
        }
        ShownIdentity identity = IssueBelow(*above, own, GenerateEcKey());
        while (!authorities.empty()) {
            identity.chain.push_back(std::move(authorities.back().certificate));
            authorities.pop_back();
        }
        return identity;
    }

private:
    static ShownIdentity IssueBelow(
        const Authority& authority, const CertificateSpec& spec, PrivateKey key)
    {
        ShownIdentity identity{std::move(key), {}};
        identity.chain.push_back(
            MakeSigned(spec, identity.key.get(), authority.certificate.get(), authority.key.get()));
        return identity;
    }

    Authority _root;
    std::string _names;
};

Authority MakeStranger(const std::string& name)
{
    PrivateKey key = GenerateEcKey();
    Certificate certificate = MakeSelfSigned(Issuer::AuthoritySpec(name), key.get());
    return {std::move(key), std::move(certificate)};
}

PrivateKey GenerateShortKey()
{
    constexpr unsigned Bits = 1024;
    return MakeKey(EVP_RSA_gen(Bits));
}

/** The server's own certificate, with one thing changed. */
template <class Change>
ShownIdentity IssueChanged(const Issuer& issuer, const Change& change)
{
    CertificateSpec spec = issuer.ServerSpec();
    change(spec);
    return issuer.Issue(spec);
}

/** The certificate of the authority between server and root, with one thing changed. */
template <class Change>
ShownIdentity IssueBelowChanged(const Issuer& issuer, const Change& change)
{
    CertificateSpec spec = Issuer::AuthoritySpec();
    change(spec);
    return issuer.IssueThrough({spec}, issuer.ServerSpec());
}

ShownIdentity IssueThroughMany(const Issuer& issuer, int count)
{
    std::vector<CertificateSpec> specs;
    specs.reserve(static_cast<std::size_t>(count));
    for (int i = 0; i < count; ++i) {
        specs.push_back(Issuer::AuthoritySpec("intermediate " + std::to_string(i)));
    }
    return issuer.IssueThrough(specs, issuer.ServerSpec());
}

ShownIdentity SignItself(const Issuer& issuer)
{
    ShownIdentity identity{GenerateEcKey(), {}};
    identity.chain.push_back(MakeSelfSigned(issuer.ServerSpec(), identity.key.get()));
    return identity;
}

ShownIdentity IssueByStranger(const Issuer& issuer, const std::string& name, bool isShown)
{
    Authority stranger = MakeStranger(name);
    ShownIdentity identity = issuer.IssueBelow(stranger);
    if (isShown) {
        identity.chain.push_back(std::move(stranger.certificate));
    }
    return identity;
}

ShownIdentity WithoutAuthorities(ShownIdentity identity)
{
    identity.chain.resize(1);
    return identity;
}

ShownIdentity WithAuthoritiesReversed(ShownIdentity identity)
{
    std::reverse(identity.chain.begin() + 1, identity.chain.end());
    return identity;
}

ShownIdentity WithAStranger(ShownIdentity identity)
{
    identity.chain.push_back(MakeStranger("stranger").certificate);
    return identity;
}

using Fault = std::function<ShownIdentity(const Issuer&)>;

/** A fault of the server's own certificate. */
template <class Change>
Fault Own(const Change& change)
{
    return [change](const Issuer& issuer) { return IssueChanged(issuer, change); };
}

/** One of the authority between server and root. */
template <class Change>
Fault Above(const Change& change)
{
    return [change](const Issuer& issuer) { return IssueBelowChanged(issuer, change); };
}

using Spec = CertificateSpec;

const std::map<std::string, Fault>& GetOwnFaults()
{
    static const std::map<std::string, Fault> faults = {
        {"honest", Own([](Spec&) {})},
        {"expired", Own([](Spec& spec) { spec.notAfter = LongAgo; })},
        {"not-yet-valid", Own([](Spec& spec) { spec.notBefore = FarAhead; })},
        {"never-valid", Own([](Spec& spec) {
             spec.notBefore = FarAhead;
             spec.notAfter = LongAgo;
         })},
        {"other-name", Own([](Spec& spec) { spec.alternativeNames = "DNS:sts.other.test"; })},
        {"other-address", Own([](Spec& spec) { spec.alternativeNames = "IP:127.0.0.2"; })},
        {"address-as-name", Own([](Spec& spec) { spec.alternativeNames = "DNS:127.0.0.1"; })},
        {"wildcard-address", Own([](Spec& spec) { spec.alternativeNames = "DNS:*.0.0.1"; })},
        {"common-name-alone", Own([](Spec& spec) {
             spec.commonName = "127.0.0.1";
             spec.alternativeNames.clear();
         })},
        {"for-clients", Own([](Spec& spec) { spec.extendedKeyUsage = "clientAuth"; })},
        {"for-code", Own([](Spec& spec) { spec.extendedKeyUsage = "critical,codeSigning"; })},
        {"no-signing", Own([](Spec& spec) { spec.keyUsage = "critical,cRLSign"; })},
        {"unknown-critical", Own([](Spec& spec) { spec.unknownExtension = "critical,DER:0500"; })},
        {"sha1", Own([](Spec& spec) { spec.digest = EVP_sha1(); })},
        {"md5",
         [](const Issuer& issuer) { // which goes with RSA alone
             Spec spec = issuer.ServerSpec();
             spec.digest = EVP_md5();
             return issuer.IssueThrough({Issuer::AuthoritySpec()}, spec, &GenerateRsaKey);
         }},
        {"short-key",
         [](const Issuer& issuer) {
             return issuer.Issue(issuer.ServerSpec(), GenerateShortKey());
         }},
        {"short-curve",
         [](const Issuer& issuer) {
             return issuer.Issue(issuer.ServerSpec(), MakeKey(EVP_EC_gen("P-192")));
         }},
        {"ed25519",
         [](const Issuer& issuer) {
             return issuer.Issue(
                 issuer.ServerSpec(), MakeKey(EVP_PKEY_Q_keygen(nullptr, nullptr, "ED25519")));
         }},
        {"self-signed", &SignItself},
        {"none", [](const Issuer&) { return ShownIdentity{}; }},
    };
    return faults;
}

const std::map<std::string, Fault>& GetFaultsAbove()
{
    static const std::map<std::string, Fault> faults = {
        {"stranger-below",
         [](const Issuer& issuer) { return IssueByStranger(issuer, "stranger", false); }},
        {"stranger-shown",
         [](const Issuer& issuer) { return IssueByStranger(issuer, "stranger", true); }},
        {"stranger-of-that-name",
         [](const Issuer& issuer) {
             return IssueByStranger(issuer, "SsoClient development CA", true);
         }},
        {"intermediate", Above([](Spec&) {})},
        {"intermediate-expired", Above([](Spec& spec) { spec.notAfter = LongAgo; })},
        {"intermediate-not-yet-valid", Above([](Spec& spec) { spec.notBefore = FarAhead; })},
        {"intermediate-no-authority",
         Above([](Spec& spec) { spec.basicConstraints = NoAuthority; })},
        {"intermediate-no-signing",
         Above([](Spec& spec) { spec.keyUsage = "critical,digitalSignature"; })},
        {"intermediate-unknown-critical",
         Above([](Spec& spec) { spec.unknownExtension = "critical,DER:0500"; })},
        {"intermediate-sha1", Above([](Spec& spec) { spec.digest = EVP_sha1(); })},
        {"intermediate-short-key",
         [](const Issuer& issuer) {
             return issuer.IssueThrough(
                 {Issuer::AuthoritySpec()}, issuer.ServerSpec(), &GenerateShortKey);
         }},
        {"permits-other-addresses", Above([](Spec& spec) {
             spec.nameConstraints = "critical,permitted;IP:10.0.0.0/255.0.0.0";
         })},
        {"excludes-this-address", Above([](Spec& spec) {
             spec.nameConstraints = "critical,excluded;IP:127.0.0.0/255.0.0.0";
         })},
        {"path-too-long",
         [](const Issuer& issuer) {
             Spec last = Issuer::AuthoritySpec("last");
             last.basicConstraints = "critical,CA:TRUE,pathlen:0";
             return issuer.IssueThrough(
                 {last, Issuer::AuthoritySpec("one more")}, issuer.ServerSpec());
         }},
        {"intermediate-missing",
         [](const Issuer& issuer) { return WithoutAuthorities(IssueThroughMany(issuer, 1)); }},
        {"chain-of-8", [](const Issuer& issuer) { return IssueThroughMany(issuer, 8); }},
        {"chain-reversed",
         [](const Issuer& issuer) { return WithAuthoritiesReversed(IssueThroughMany(issuer, 3)); }},
        {"chain-with-a-stranger",
         [](const Issuer& issuer) { return WithAStranger(IssueThroughMany(issuer, 1)); }},
        {"chain-of-120", [](const Issuer& issuer) { return IssueThroughMany(issuer, 120); }},
        {"chain-of-400", [](const Issuer& issuer) { return IssueThroughMany(issuer, 400); }},
    };
    return faults;
}

} // namespace

ShownIdentity IssueIdentity(const std::string& fault, const State& state, const std::string& host)
{
    const Issuer issuer(state, State::GetAlternativeNames(host));
    for (const auto* const faults : {&GetOwnFaults(), &GetFaultsAbove()}) {
        const auto found = faults->find(fault);
        if (found != faults->end()) {
            return found->second(issuer);
        }
    }
    throw std::invalid_argument("there is no certificate that is " + fault);
}

} // namespace DevSts
