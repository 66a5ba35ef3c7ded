#include "ssoClient/ServiceDialect.h"

namespace SsoClient {

namespace {

constexpr char CxfDomain[] = "http://cxf.apache.org/sts";
constexpr char AdFsUpnAttribute[] = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/upn";

SubjectRule CxfRule(SubjectForm form)
{
    SubjectRule rule;
    rule.form = form;
    rule.nameQualifier = std::string(CxfDomain);
    rule.domain = std::string(CxfDomain);
    return rule;
}

SubjectRule AdFsRule()
{
    SubjectRule rule;
    rule.form = SubjectForm::UPN;
    rule.attribute = std::string(AdFsUpnAttribute);
    return rule;
}

/** What every service but the one of the default answers and understands. */
ServiceDialect Common()
{
    ServiceDialect dialect;
    dialect.writesFalseDelegatable = false;
    dialect.useKey = UseKeyForm::CERTIFICATE;
    dialect.useKeyWithPresentedToken = true;
    dialect.hyphenInSamlTokenType = true;
    dialect.validatesWithCredentials = true;
    dialect.anyReplyForm = true;
    dialect.wsseFailedAuthentication = true;
    dialect.addressing = true;
    dialect.reading = TokenReading();
    return dialect;
}

} // namespace

ServiceDialect ServiceDialect::ApacheCxf()
{
    ServiceDialect dialect = Common();
    // One and the same user is named in another format in a token of the user's own, in one that
    // was asked for on the user's behalf, and in one for another token.
    dialect.reading->mapping.isOneDirectory = true;
    dialect.reading->mapping.subjects = {
        CxfRule(SubjectForm::PERSISTENT),
        CxfRule(SubjectForm::PLAIN),
        CxfRule(SubjectForm::X509_SUBJECT)};
    return dialect;
}

ServiceDialect ServiceDialect::AdFs13()
{
    ServiceDialect dialect = Common();
    dialect.soap = SoapVersion::SOAP_1_2;
    dialect.signatureScope = SignatureScope::TIMESTAMP_AND_TO;
    dialect.audienceForm = AudienceForm::APPLIES_TO;
    dialect.writesFalseRenewing = false;
    dialect.reading->mapping.subjects = {AdFsRule()};
    return dialect;
}

ServiceDialect ServiceDialect::AdFs2005()
{
    ServiceDialect dialect = AdFs13();
    dialect.trust = TrustVersion::WS_TRUST_2005_02;
    return dialect;
}

} // namespace SsoClient
