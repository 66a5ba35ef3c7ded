#include "devsts/token/AssertionWriter.h"

#include "devsts/wire/Base64.h"
#include "devsts/wire/Names.h"

namespace DevSts {

namespace {

struct Writer
{
    const Assertion& assertion;
    xmlNode* root;
    xmlNs* saml;
    xmlNs* xsi;
    xmlNs* del;
    xmlNs* rsa;

    void AddNameId(
        xmlNode* parent, const char* element, const char* format, const std::string& value)
    {
        SetAttribute(AddElement(parent, saml, element, value), "Format", format);
    }

    void AddKeyInfo(xmlNode* parent, const std::string& der)
    {
        xmlNode* keyInfo = AddElement(parent, nullptr, "KeyInfo");
        xmlNs* ds = DeclareNamespace(keyInfo, "ds", Names::Ds);
        xmlSetNs(keyInfo, ds);
        xmlNode* data = AddElement(keyInfo, ds, "X509Data");
        AddElement(data, ds, "X509Certificate", EncodeBase64(der));
    }

    // [SAML-CORE 2.4.1.3], [SAML-PROF 3.1]
    void AddHolderOfKey(xmlNode* confirmation)
    {
        SetAttribute(confirmation, "Method", Names::MethodHolderOfKey);
        AddDelegateId(confirmation);
        xmlNode* data = AddElement(confirmation, saml, "SubjectConfirmationData");
        SetAttribute(data, xsi, "type", "saml:KeyInfoConfirmationDataType");
        AddKeyInfo(data, *assertion.confirmationCertificateDer);
    }

    void AddBearer(xmlNode* confirmation)
    {
        SetAttribute(confirmation, "Method", Names::MethodBearer);
        AddDelegateId(confirmation);
        xmlNode* data = AddElement(confirmation, saml, "SubjectConfirmationData");
        SetAttribute(data, "NotOnOrAfter", FormatTime(assertion.notOnOrAfter));
    }

    void AddDelegateId(xmlNode* confirmation)
    {
        if (!assertion.delegates.empty()) {
            AddNameId(confirmation, "NameID", Names::FormatUpn, assertion.delegates.back().name);
        }
    }

    void AddSubject()
    {
        xmlNode* subject = AddElement(root, saml, "Subject");
        AddNameId(subject, "NameID", Names::FormatUpn, assertion.subject);
        xmlNode* confirmation = AddElement(subject, saml, "SubjectConfirmation");
        if (assertion.confirmationCertificateDer) {
            AddHolderOfKey(confirmation);
        } else {
            AddBearer(confirmation);
        }
    }

    void AddConditions()
    {
        xmlNode* conditions = AddElement(root, saml, "Conditions");
        SetAttribute(conditions, "NotBefore", FormatTime(assertion.notBefore));
        SetAttribute(conditions, "NotOnOrAfter", FormatTime(assertion.notOnOrAfter));
        if (assertion.proxyCount) {
            xmlNode* restriction = AddElement(conditions, saml, "ProxyRestriction");
            SetAttribute(restriction, "Count", std::to_string(*assertion.proxyCount));
        }
        if (assertion.renewCount) {
            xmlNode* restriction = AddElement(conditions, saml, "Condition");
            SetAttribute(restriction, xsi, "type", "rsa:RenewRestrictionType");
            SetAttribute(restriction, "Count", std::to_string(*assertion.renewCount));
        }
        AddDelegation(conditions);
        AddAudience(conditions);
    }

    // [SAML-DEL 2.3]
    void AddDelegation(xmlNode* conditions)
    {
        if (assertion.delegates.empty()) {
            return;
        }
        xmlNode* restriction = AddElement(conditions, saml, "Condition");
        SetAttribute(restriction, xsi, "type", "del:DelegationRestrictionType");
        for (const Delegate& delegate : assertion.delegates) {
            xmlNode* element = AddElement(restriction, del, "Delegate");
            SetAttribute(element, "DelegationInstant", FormatTime(delegate.instant));
            AddNameId(element, "NameID", Names::FormatUpn, delegate.name);
        }
    }

    void AddAudience(xmlNode* conditions)
    {
        if (assertion.audience.empty()) {
            return;
        }
        xmlNode* restriction = AddElement(conditions, saml, "AudienceRestriction");
        for (const std::string& audience : assertion.audience) {
            AddElement(restriction, saml, "Audience", audience);
        }
    }

    void AddAdvice()
    {
        if (assertion.advice.empty()) {
            return;
        }
        xmlNode* element = AddElement(root, saml, "Advice");
        for (const Advice& advice : assertion.advice) {
            xmlNode* rsaAdvice = AddElement(element, rsa, "RSAAdvice");
            SetAttribute(rsaAdvice, "AdviceSource", advice.source);
            for (const AdviceAttribute& attribute : advice.attributes) {
                AddAttribute(rsaAdvice, attribute.name, "", attribute.values);
            }
        }
    }

    void AddAttribute(
        xmlNode* parent,
        const std::string& name,
        const std::string& friendlyName,
        const std::vector<std::string>& values)
    {
        xmlNode* element = AddElement(parent, saml, "Attribute");
        SetAttribute(element, "Name", name);
        SetAttribute(element, "NameFormat", Names::FormatUri);
        if (!friendlyName.empty()) {
            SetAttribute(element, "FriendlyName", friendlyName);
        }
        for (const std::string& value : values) {
            SetAttribute(
                AddElement(element, saml, "AttributeValue", value), xsi, "type", "xs:string");
        }
    }

    void AddStatements()
    {
        xmlNode* authn = AddElement(root, saml, "AuthnStatement");
        SetAttribute(authn, "AuthnInstant", FormatTime(assertion.authnInstant));
        xmlNode* context = AddElement(authn, saml, "AuthnContext");
        AddElement(context, saml, "AuthnContextClassRef", assertion.authnContext);

        xmlNode* attributes = AddElement(root, saml, "AttributeStatement");
        AddAttribute(attributes, Names::AttributeGroups, "Groups", assertion.groups);
        AddAttribute(attributes, Names::AttributeGivenName, "givenName", {assertion.givenName});
        AddAttribute(attributes, Names::AttributeSurname, "surname", {assertion.surname});
        AddAttribute(
            attributes,
            Names::AttributeIsSolution,
            "isSolution",
            {assertion.isSolution ? "true" : "false"});
    }
};

} // namespace

XmlDocument WriteAssertion(const Assertion& assertion)
{
    XmlDocument doc = NewDocument("saml", {Names::Saml, "Assertion"});
    xmlNode* root = xmlDocGetRootElement(doc.get());
    // All on the root: the signature's inclusive prefix list names those that stand in values,
    // and so protects their bindings. [EXC-C14N 1.3]
    DeclareNamespace(root, "xs", Names::Xs);
    Writer writer{
        assertion,
        root,
        root->ns,
        DeclareNamespace(root, "xsi", Names::Xsi),
        DeclareNamespace(root, "del", Names::Del),
        DeclareNamespace(root, "rsa", Names::Rsa)};
    SetAttribute(root, "Version", "2.0");
    SetAttribute(root, "ID", assertion.id);
    SetAttribute(root, "IssueInstant", FormatTime(assertion.issueInstant));
    writer.AddNameId(root, "Issuer", Names::FormatEntity, Names::Issuer);
    writer.AddSubject();
    writer.AddConditions();
    writer.AddAdvice();
    writer.AddStatements();
    return doc;
}

} // namespace DevSts
