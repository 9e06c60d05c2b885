// dirbase value
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/syntax_value.h"
#include "servers/vrnd/libdirbase/model/timestamp.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "tools/dirbase/answers.h"
#include "tools/dirbase/data_commands.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

namespace {

// The code of a syntax's OID, or of the attribute type with a name.
std::uint32_t find_syntax(const std::string& word)
{
    if (const std::uint32_t code = ldcf_rdbm::syntax_code(word.c_str()); code != 0) {
        return code;
    }
    char* base = nullptr;
    const asyntaxinfo* info = ldcf_api_attr_get_info(word.c_str(), &base);
    std::free(base);
    if (info == nullptr) {
        throw tool_failure(status_unusable, "", 0,
                           word +
                               ": neither an attribute type of the schema nor the OID of a syntax with a normal form");
    }
    return info->syntax;
}

std::string time_text(const tag_timestamp_struct& time)
{
    char text[64];
    std::snprintf(text, sizeof text, "%04d-%02d-%02dT%02d:%02d:%02d.%09dZ", time.year, time.month, time.day, time.hour,
                  time.minute, time.second, time.fraction);
    return text;
}

// What a value is held as: its text in normal form, or the number or the time that it stands for. The result tells
// whether it is one.
int normal_form(const std::string& value, std::uint32_t code, std::string& form)
{
    if (code == SC_BIN) {
        form = value;
        return LDAP_SUCCESS;
    }
    if (code == SC_INT || code == SC_BOOL || code == SC_GT || code == SC_UTCT) {
        int result = LDAP_SUCCESS;
        const heap_pointer<void> typed(str2syntaxvalue(value.c_str(), code, &result));
        if (typed != nullptr) {
            tag_timestamp_struct time = {};
            std::int32_t number = 0;
            if (code == SC_GT || code == SC_UTCT) {
                std::memcpy(&time, typed.get(), sizeof time);
                form = time_text(time);
            } else {
                std::memcpy(&number, typed.get(), sizeof number);
                form = code == SC_INT ? std::to_string(number) : number != 0 ? "TRUE" : "FALSE";
            }
        }
        return result;
    }
    char* text = strdup(value.c_str());
    if (text == nullptr) {
        throw std::bad_alloc();
    }
    const int result = value_normalize(&text, code);
    const heap_text owner(text);
    form = text;
    return result;
}

refusal_words refusal(const std::string& value, std::uint32_t code, int result)
{
    refusal_words why = {.result = result};
    if ((code & SC_DN) != 0) {
        const refusal_words of_dn = why_dn_is_refused(value);
        return of_dn.result == result ? of_dn : why;
    }
    if (const char* const fault = fault_of_syntax(code); fault != nullptr) {
        why.words = std::string("the value ") + fault;
    }
    return why;
}

answer normalize(const std::string& value, std::uint32_t code)
{
    std::string form;
    const int result = normal_form(value, code, form);
    if (result == LDAP_NO_MEMORY) {
        throw std::bad_alloc();
    }
    const bool is_good = result == LDAP_SUCCESS;
    answer given = {is_good, shown(form) + "\n", {{"value", json_of_value(value)}, {"ok", is_good}}};
    if (is_good) {
        given.member["normal"] = json_of_value(form);
    } else {
        const refusal_words why = refusal(value, code, result);
        given.text = "refused    " + why.text() + "\n";
        given.member.update(why.as_json());
    }
    return given;
}

}  // namespace

const char* fault_of_syntax(std::uint32_t syntax)
{
    switch (syntax) {
    case SC_INT: return "is no integer from -2147483648 to 2147483647";
    case SC_BOOL: return "is neither TRUE nor FALSE";
    case SC_GT: return "is no time of the form YYYYMMDDHHMMSS[.F](Z|+HHMM|-HHMM)";
    case SC_UTCT: return "is no time of the form YYMMDDHHMM[SS](Z|+HHMM|-HHMM)";
    case SC_CIS | SC_BIT_STRING: return "is no bit string of the form '0101'B";
    case SC_CIS | SC_NUMERIC_STRING: return "is no numeric string: digits without spaces between them";
    case SC_CIS | SC_COUNTRY_STRING: return "is no country code of two letters";
    default: return nullptr;
    }
}

int normalize_values(const common_options& common, const std::string& syntax, const std::vector<std::string>& values)
{
    load_for_names(common.schema_folder);
    const std::uint32_t code = find_syntax(syntax);
    return answer_each(common, {.list = "values", .takes_lines = false}, values,
                       [code](const std::string& value) { return normalize(value, code); });
}

}  // namespace dirbase_tool
