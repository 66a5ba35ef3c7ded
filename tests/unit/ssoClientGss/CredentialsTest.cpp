#include "ssoClientGss/Credentials.h"

#include "Realm.h"

using namespace SsoClient::Gss;

namespace {

class LogOn : public Realm
{};

/** Whose tickets are in the cache, or why there are none. */
std::string GetOwner(const std::string& cacheName)
{
    krb5_context raw = nullptr;
    Require(krb5_init_context(&raw));
    const KerberosContext context(raw);
    krb5_ccache cache = nullptr;
    Require(krb5_cc_resolve(raw, cacheName.c_str(), &cache));
    krb5_principal owner = nullptr;
    const krb5_error_code code = krb5_cc_get_principal(raw, cache, &owner);
    krb5_cc_close(raw, cache);
    if (code != 0) {
        return GetKerberosError(raw, code);
    }
    const KerberosPrincipal principal(owner, {raw});
    char* name = nullptr;
    Require(krb5_unparse_name(raw, owner, &name));
    std::string text = name;
    krb5_free_unparsed_name(raw, name);
    return text;
}

} // namespace

TEST_F(LogOn, KeepsItsTicketInMemoryForAsLongAsItLives)
{
    std::optional<KeytabLogOn> logOn;
    logOn.emplace("alice", kdc->GetFile("alice.keytab"));
    const std::string cache = logOn->GetCacheName();
    EXPECT_EQ(0U, cache.find("MEMORY:")) << cache;
    EXPECT_EQ("alice@EXAMPLE.TEST", GetOwner(cache));
    logOn.reset();
    EXPECT_EQ("No credentials cache found", GetOwner(cache));
}

TEST_F(LogOn, SharesItsCacheWithNoOther)
{
    const KeytabLogOn alice("alice", kdc->GetFile("alice.keytab"));
    const KeytabLogOn mallory("mallory", kdc->GetFile("mallory.keytab"));
    EXPECT_EQ("alice@EXAMPLE.TEST", GetOwner(alice.GetCacheName()));
    EXPECT_EQ("mallory@EXAMPLE.TEST", GetOwner(mallory.GetCacheName()));
}
