#include "DialectOptions.h"

#include "Arguments.h"
#include "ExitCode.h"

#include <algorithm>
#include <iterator>

using SsoClient::ServiceDialect;
using SsoClient::SubjectForm;
using SsoClient::SubjectRule;

namespace {

constexpr char DialectGroup[] = "Other services";

struct NamedForm
{
    const char* name;
    SubjectForm form;
};

constexpr NamedForm Forms[] = {
    {"upn", SubjectForm::UPN},
    {"email", SubjectForm::EMAIL},
    {"windows", SubjectForm::WINDOWS_NAME},
    {"x509", SubjectForm::X509_SUBJECT},
    {"persistent", SubjectForm::PERSISTENT},
    {"plain", SubjectForm::PLAIN},
};

struct NamedDialect
{
    const char* name;
    ServiceDialect (*make)();
};

constexpr NamedDialect Dialects[] = {
    {"default", &ServiceDialect::Default},
    {"cxf", &ServiceDialect::ApacheCxf},
    {"adfs2005", &ServiceDialect::AdFs2005},
    {"adfs13", &ServiceDialect::AdFs13},
};

template <class Named, std::size_t Count>
const Named* Find(const Named (&all)[Count], const std::string& name)
{
    const auto* const found = std::find_if(
        std::begin(all), std::end(all), [&](const Named& each) { return name == each.name; });
    return found == std::end(all) ? nullptr : found;
}

/** The form and, behind an equals sign, the attribute. */
SubjectRule ParseSubject(const std::string& text)
{
    const std::size_t equals = text.find('=');
    SubjectRule rule;
    rule.form = Find(Forms, text.substr(0, equals))->form;
    if (equals != std::string::npos) {
        rule.attribute = text.substr(equals + 1);
    }
    return rule;
}

std::string CheckSubject(const std::string& text)
{
    return Find(Forms, text.substr(0, text.find('='))) == nullptr
               ? "`" + text + "' is not upn, email, windows, x509, persistent or plain"
               : CheckNotEmptyText(text);
}

std::string CheckDialect(const std::string& text)
{
    return Find(Dialects, text) == nullptr
               ? "`" + text + "' is not default, cxf, adfs2005 or adfs13"
               : std::string();
}

} // namespace

void ReadingOptions::AddTo(const Command& owner)
{
    const Command command = owner.InGroup(DialectGroup);
    command.AddFlag("--general", general, "Read SAML 2.0 assertions of any producer");
    command
        .AddOption(
            "--subject",
            subjects,
            "Take the subject from a NameID of this format, or with =ATTRIBUTE from that "
            "attribute: upn, email, windows, x509, persistent or plain; may repeat")
        .Check(CheckSubject)
        .ValueName("FORMAT");
    command.AddOption("--domain", domain, "The domain of names that have none")
        .Check(CheckName)
        .ValueName("NAME");
    command
        .AddOption(
            "--group-attribute",
            groupAttributes,
            "The attribute with the subject's groups, written DOMAIN\\name, or as names of the "
            "domain if --domain is given; may repeat")
        .Check(CheckNotEmptyText)
        .ValueName("NAME");
    decryptionKeys.AddTo(command);
}

bool ReadingOptions::IsGiven() const
{
    return general || domain || !subjects.empty() || !groupAttributes.empty()
           || decryptionKeys.IsGiven();
}

void ReadingOptions::ApplyTo(SsoClient::TokenReading& reading) const
{
    reading.rules.decryptionKeys = decryptionKeys.Get();
    SsoClient::SubjectMapping& mapping = reading.mapping;
    if (!subjects.empty()) {
        mapping.subjects.clear();
        std::transform(
            subjects.begin(), subjects.end(), std::back_inserter(mapping.subjects), ParseSubject);
    }
    if (domain) {
        mapping.defaultDomain = *domain;
    }
    for (const std::string& attribute : groupAttributes) {
        SsoClient::GroupRule rule;
        rule.attribute = attribute;
        rule.form = domain ? SsoClient::GroupForm::PLAIN : SsoClient::GroupForm::QUALIFIED;
        mapping.groups.push_back(rule);
    }
}

void DialectOptions::AddTo(const Command& owner)
{
    owner.InGroup(DialectGroup)
        .AddOption(
            "--dialect",
            name,
            "How the service wants to be spoken to: default, cxf, adfs2005 or adfs13; what it "
            "issues is compared with what is asked for")
        .Check(CheckDialect)
        .ValueName("NAME");
    reading.AddTo(owner);
}

void DialectOptions::AddIssueTo(const Command& owner, SsoClient::TokenSpec& spec)
{
    const Command command = owner.InGroup(DialectGroup);
    command
        .AddOption(
            "--applies-to",
            [this, &spec](const std::string& uri) {
                appliesTo = true;
                spec.audienceRestriction.insert(uri);
            },
            "Ask for a token for this relying party, with wsp:AppliesTo")
        .Check(CheckNotEmptyText)
        .ValueName("URI");
    command.AddOption("--claim", claims, "Ask for this claim; may repeat")
        .Check(CheckNotEmptyText)
        .ValueName("URI");
}

void DialectOptions::AddDelegatingTo(const Command& owner)
{
    const Command command = owner.InGroup(DialectGroup);
    const Option onBehalfOf = command
                                  .AddOption(
                                      "--on-behalf-of",
                                      onBehalfOfFile,
                                      "Ask for a token of this token's subject (wst:OnBehalfOf)")
                                  .Check(CheckNotEmpty)
                                  .ValueName("FILE");
    command
        .AddOption(
            "--act-as", actAsFile, "Ask for a token to act as this token's subject (wst14:ActAs)")
        .Check(CheckNotEmpty)
        .ValueName("FILE")
        .Excludes(onBehalfOf);
}

const std::string& DialectOptions::GetPresentedFile() const
{
    return actAsFile.empty() ? onBehalfOfFile : actAsFile;
}

boost::optional<ServiceDialect> DialectOptions::Make() const
{
    if (!name && !reading.IsGiven() && !appliesTo && claims.empty() && GetPresentedFile().empty()) {
        return boost::none;
    }
    ServiceDialect dialect = Find(Dialects, name.value_or("default"))->make();
    if (reading.IsGiven()) {
        dialect.reading = dialect.reading.value_or(SsoClient::TokenReading());
        reading.ApplyTo(*dialect.reading);
    }
    if (appliesTo) {
        dialect.audienceForm = SsoClient::AudienceForm::APPLIES_TO;
    }
    for (const std::string& claim : claims) {
        dialect.claims.push_back({claim, false});
    }
    if (!GetPresentedFile().empty()) {
        dialect.presentedToken = actAsFile.empty() ? SsoClient::PresentedTokenForm::ON_BEHALF_OF
                                                   : SsoClient::PresentedTokenForm::ACT_AS;
    }
    return dialect;
}
