#include "ssoClientRuntime/DelegationKey.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

/** Writes fields so that no two sequences of them have the same text. */
class FieldWriter
{
public:
    explicit FieldWriter(Quillon::Wiped& out)
        : _out(out)
    {}

    void Write(std::string_view field)
    {
        Write(static_cast<long long>(field.size()));
        _out.Append(field);
    }
    void Write(long long number) { _out.Append(std::to_string(number) + ";"); }

    template <class Range, class WriteOne>
    void WriteAll(const Range& range, const WriteOne& writeOne)
    {
        Write(static_cast<long long>(range.size()));
        for (const auto& one : range) {
            writeOne(one);
        }
    }

private:
    Quillon::Wiped& _out;
};

void WriteSpec(const TokenSpec& spec, FieldWriter& out)
{
    // Names every member: one that is added later does not compile until it stands here.
    const auto& [lifetimeSec, audience, advice, delegable, delegateTo, renewable, confirmation] =
        spec;
    const auto writeText = [&](const std::string& text) { out.Write(text); };
    const auto writeAttribute = [&](const AdviceAttribute& attribute) {
        out.Write(attribute.name);
        out.WriteAll(attribute.values, writeText);
    };
    out.Write(lifetimeSec);
    out.WriteAll(audience, writeText);
    out.WriteAll(advice, [&](const Advice& one) {
        out.Write(one.source);
        out.WriteAll(one.attributes, writeAttribute);
    });
    out.Write(static_cast<long long>(delegable));
    out.Write(static_cast<long long>(delegateTo.has_value()));
    out.Write(delegateTo.get_value_or(std::string()));
    out.Write(static_cast<long long>(renewable));
    out.Write(static_cast<long long>(confirmation));
}

std::string GetAddress(const void* object)
{
    return std::to_string(reinterpret_cast<std::uintptr_t>(object)) + ";";
}

} // namespace

DelegationKey::DelegationKey(Service service, const SamlToken& presented, const TokenSpec& spec)
    : _service(std::move(service))
{
    _text.Append(GetAddress(_service.get()));
    FieldWriter writer(_text);
    WriteSpec(spec, writer);
    _specBytes = _text.Get().size();
    _text.Append(presented.ToXml());
    _digest = Quillon::Crypto::Sha256(_text.Get());
}

bool DelegationKey::IsAbout(const SamlToken& presented) const
{
    return std::string_view(_text.Get()).substr(_specBytes) == presented.ToXml();
}

} // namespace SsoClient
