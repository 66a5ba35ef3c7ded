#pragma once

#include "ssoClient/SubjectMapping.h"

/** Users and groups by the rules of a mapping. */
namespace SsoClient::GeneralReader {

/** @throws Quillon::InvalidArgumentException  the rules may give different people one name. */
void CheckRules(const SubjectMapping& mapping);

/** The subject by the first rule that fits. @throws ParseException  none does. */
PrincipalId FindSubject(const AssertionFacts& facts, const SubjectMapping& mapping);

/** The rule by which it is found; null if none fits. */
const SubjectRule* FindSubjectRule(const AssertionFacts& facts, const SubjectMapping& mapping);

/** The same for a delegate, who has no attributes. */
PrincipalId FindDelegate(const AssertionNameId& nameId, const SubjectMapping& mapping);

/** @throws ParseException  a value is not of the form that the rule says. */
std::vector<PrincipalId> FindGroups(const AssertionFacts& facts, const SubjectMapping& mapping);

/** The values of all attributes of that name. @throws ParseException  one of them is no text. */
std::vector<std::string> GetTextValues(const AssertionFacts& facts, const std::string& name);

} // namespace SsoClient::GeneralReader
