// dirbase dn
#include <memory>
#include <new>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/dn_check.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "tools/dirbase/answers.h"
#include "tools/dirbase/data_commands.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

namespace {

struct free_dn {
    void operator()(ldap_escDN* dn) const { free_ldap_escDN(&dn); }
};
using dn_pointer = std::unique_ptr<ldap_escDN, free_dn>;

dn_pointer not_null(ldap_escDN* dn)
{
    if (dn == nullptr) {
        throw std::bad_alloc();
    }
    return dn_pointer(dn);
}

struct fault_words {
    int error;
    const char* words;
};

constexpr fault_words faults[] = {
    {DN_ERR_EMPTY_VALUE, "the last value is empty"},
    {DN_ERR_SYNTAX, "no attribute type, \"=\" or proper value here"},
    {DN_ERR_ESCAPE, "this can't be escaped"},
    {DN_ERR_HEX_PAIR, "the second digit of a hexadecimal pair is missing"},
    {DN_ERR_HEX_STRING, "no hexadecimal digit"},
    {DN_ERR_SPECIAL, "this character has to be escaped"},
    {DN_ERR_OID, "an OID has a digit here"},
    {DN_ERR_AFTER_QUOTES, "something follows the closing quote"},
    {DN_ERR_UNDEFINED, "the schema has no such attribute type"},
    {DN_ERR_UTF8, "a value isn't UTF-8"},
    {DN_ERR_TOO_LONG, "longer than 2000 bytes"},
};

// Parses once more, RDN by RDN, up to the fault.
std::ptrdiff_t offset_of_fault(const std::string& dn, bool light)
{
    dn_pointer work_dn = not_null(new_ldap_escDN(2 * dn.size() + 2));
    ldap_escDN* record = work_dn.release();
    ldap_escDN_work work = {&record, 0, 2 * dn.size() + 2};
    const char* at = dn.c_str();
    std::ptrdiff_t offset = -1;
    while (*at != '\0' && offset < 0) {
        const std::unique_ptr<ldapDN_elem33, void (*)(ldapDN_elem33*)> rdn(new_ldapDN_elem33(), free_ldapDN_elem33);
        int error = 0;
        at = rdn == nullptr ? "" : parse_escRDN(at, rdn.get(), &work, dn_order_sorted, light ? 0 : 1, &error);
        offset = error != 0 ? at - dn.c_str() : offset;
        at += *at != '\0' ? 1 : 0;
    }
    free_ldap_escDN(&record);
    return offset;
}

dn_pointer normalized(const std::string& dn, bool light)
{
    return not_null(light ? dn_normalize_light_esc(dn.c_str()) : dn_normalize_esc(dn.c_str()));
}

refusal_words verdict_on(const std::string& dn, const ldap_escDN& parsed, bool light)
{
    refusal_words found;
    found.result = parsed.result;
    for (const fault_words& known : faults) {
        found.words = known.error == parsed.internal_error ? known.words : found.words;
    }
    const bool has_place = parsed.result != LDAP_SUCCESS && parsed.internal_error != DN_ERR_TOO_LONG;
    found.offset = has_place ? offset_of_fault(dn, light) : -1;
    return found;
}

answer refusal(const std::string& dn, const refusal_words& why)
{
    return {
        false, "refused    " + why.text() + "\n", {{"dn", json_of_value(dn)}, {"ok", false}, {"error", why.as_json()}}};
}

answer normalize(const std::string& dn, bool light)
{
    const dn_pointer parsed = normalized(dn, light);
    if (parsed->result != LDAP_SUCCESS) {
        return refusal(dn, verdict_on(dn, *parsed, light));
    }
    const std::string canonical = GetDNString33(parsed.get());
    const std::string upper = GetDNUpper33(parsed.get());
    return {true,
            "canonical  " + shown(canonical) + "\nupper      " + shown(upper) + "\n",
            {{"dn", json_of_value(dn)},
             {"ok", true},
             {"canonical", json_of_value(canonical)},
             {"upper", json_of_value(upper)}}};
}

answer check(const std::string& dn)
{
    std::size_t offset = 0;
    refusal_words found;
    found.result = dn_check(dn.c_str(), &offset);
    if (found.result != LDAP_SUCCESS) {
        found.offset = static_cast<std::ptrdiff_t>(offset);
        return refusal(dn, found);
    }
    return {true, "ok\n", {{"dn", json_of_value(dn)}, {"ok", true}}};
}

answer parent(const std::string& dn, bool light)
{
    const dn_pointer parsed = normalized(dn, light);
    if (parsed->result != LDAP_SUCCESS) {
        return refusal(dn, verdict_on(dn, *parsed, light));
    }
    if (parsed->count < 2) {
        return {true, "none\n", {{"dn", json_of_value(dn)}, {"ok", true}, {"parent", nullptr}}};
    }
    const dn_pointer above = not_null(ParentDN33(parsed.get()));
    const std::string text = GetDNString33(above.get());
    return {true, shown(text) + "\n", {{"dn", json_of_value(dn)}, {"ok", true}, {"parent", json_of_value(text)}}};
}

// The schema that names are looked up in, unless it isn't wanted.
void load_schema(const common_options& common, bool light)
{
    if (!light) {
        load_for_names(common.schema_folder);
    }
}

}  // namespace

std::string result_name(int result)
{
    switch (result) {
    case LDAP_SUCCESS: return "success";
    case LDAP_OPERATIONS_ERROR: return "operationsError";
    case LDAP_PROTOCOL_ERROR: return "protocolError";
    case LDAP_CONFIDENTIALITY_REQUIRED: return "confidentialityRequired";
    case LDAP_UNDEFINED_TYPE: return "undefinedAttributeType";
    case LDAP_INVALID_SYNTAX: return "invalidAttributeSyntax";
    case LDAP_INVALID_DN_SYNTAX: return "invalidDNSyntax";
    case LDAP_UNWILLING_TO_PERFORM: return "unwillingToPerform";
    case LDAP_OBJECT_CLASS_VIOLATION: return "objectClassViolation";
    case LDAP_OTHER: return "other";
    case LDAP_NO_MEMORY: return "no memory";
    default: return "";
    }
}

std::string result_words(int result)
{
    const std::string name = result_name(result);
    return std::to_string(result) + (name.empty() ? "" : " ") + name;
}

std::string refusal_words::text() const
{
    std::string line = result_words(result);
    line += offset < 0 ? "" : " at byte " + std::to_string(offset);
    return line + (words.empty() ? "" : ": " + words);
}

json refusal_words::as_json() const
{
    json member = {{"result", result}, {"name", result_name(result)}};
    if (offset >= 0) {
        member["offset"] = offset;
    }
    if (!words.empty()) {
        member["reason"] = words;
    }
    return member;
}

refusal_words why_dn_is_refused(const std::string& dn)
{
    return verdict_on(dn, *normalized(dn, false), false);
}

std::string refusal_of_dn(const std::string& dn)
{
    return why_dn_is_refused(dn).text();
}

int ask_of_dns(const common_options& common, dn_question question, const std::vector<std::string>& dns, bool light)
{
    load_schema(common, light || question == dn_question::check);
    return answer_each(common, {.list = "dns"}, dns, [question, light](const std::string& dn) {
        return question == dn_question::normalize ? normalize(dn, light)
               : question == dn_question::parent  ? parent(dn, light)
                                                  : check(dn);
    });
}

int compare_dns(const common_options& common, const std::string& first, const std::string& second, bool light)
{
    load_schema(common, light);
    const answer answers[] = {normalize(first, light), normalize(second, light)};
    const bool refused = !answers[0].is_good || !answers[1].is_good;
    const bool same = !refused && answers[0].member["upper"] == answers[1].member["upper"];
    if (common.as_json) {
        json result = {{"ok", same}};
        if (!refused) {
            result["same"] = same;
        }
        result["dns"] = {answers[0].member, answers[1].member};
        write_json(result);
    } else if (refused) {
        write_result((answers[0].is_good ? "" : "first DN   " + answers[0].text) +
                     (answers[1].is_good ? "" : "second DN  " + answers[1].text));
    } else {
        write_result(same ? "same\n" : "different\n");
    }
    return same ? status_yes : status_findings;
}

}  // namespace dirbase_tool
