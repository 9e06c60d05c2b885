// The flat records: how a definition's syntax, rules and lengths become the codes and columns of the store.
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <memory>
#include <utility>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/backend.h"
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"
#include "servers/vrnd/libdirbase/schema/ldcf_objclass.h"
#include "servers/vrnd/libdirbase/schema/ldcf_rdbm.h"
#include "servers/vrnd/libdirbase/schema/ldcf_well_known_oids.h"

namespace {

constexpr int server_without_tables = 1;
constexpr int longest_text_column = 32700;
constexpr int longest_column = std::numeric_limits<std::uint16_t>::max();
constexpr std::uint16_t indexable_length = 240;
constexpr std::size_t longest_plain_table = 17;  // behind the qualifier
constexpr std::size_t short_qualifier_length = 8;
constexpr std::size_t short_table_front = 10;
constexpr std::size_t short_table_size = 28;
constexpr std::size_t trunc_name_front = 15;
constexpr std::size_t trunc_name_size = 19;
constexpr char trunc_suffix[] = "_T";
constexpr unsigned text_or_dn = SC_CIS | SC_CES | SC_DN;

constexpr const char* system_columns[] = {"CREATOR", "MODIFIER", "CREATE_TIMESTAMP", "MODIFY_TIMESTAMP"};

struct syntax_code {
    const char* oid;
    unsigned code;
};

constexpr syntax_code syntax_codes[] = {
    {ldcf_syntax_dn, SC_DN | SC_CIS},
    {ldcf_syntax_name_and_optional_uid, SC_DN | SC_CIS},
    {ldcf_syntax_dir, SC_CIS},
    {ldcf_syntax_ia5, SC_CIS},
    {ldcf_syntax_mhs_or_address, SC_CIS},
    {ldcf_syntax_other_mailbox, SC_CIS},
    {ldcf_syntax_postal_address, SC_CIS},
    {ldcf_syntax_protocol_information, SC_CIS},
    {ldcf_syntax_presentation_address, SC_CIS},
    {ldcf_syntax_printable, SC_CIS},
    {ldcf_syntax_substring_assertion, SC_CIS},
    {ldcf_syntax_delivery_method, SC_CIS},
    {ldcf_syntax_enhanced_guide, SC_CIS},
    {ldcf_syntax_guide, SC_CIS},
    {ldcf_syntax_supported_algorithm, SC_CIS},
    {ldcf_syntax_teletex, SC_CIS},
    {ldcf_syntax_attribute_type_description, SC_CIS},
    {ldcf_syntax_content_rule_description, SC_CIS},
    {ldcf_syntax_structure_rule_description, SC_CIS},
    {ldcf_syntax_matching_rule_description, SC_CIS},
    {ldcf_syntax_matching_rule_use_description, SC_CIS},
    {ldcf_syntax_name_form_description, SC_CIS},
    {ldcf_syntax_object_class_description, SC_CIS},
    {ldcf_syntax_oid, SC_CIS},
    {ldcf_syntax_extended_attribute_description, SC_CIS},
    {ldcf_syntax_syntax_description, SC_CIS},
    {ldcf_syntax_bit_string, SC_BIT_STRING | SC_CIS},
    {ldcf_syntax_certificate, SC_BIN},
    {ldcf_syntax_certificate_list, SC_BIN},
    {ldcf_syntax_certificate_pair, SC_BIN},
    {ldcf_syntax_fax, SC_BIN},
    {ldcf_syntax_jpeg, SC_BIN},
    {ldcf_syntax_octet_string, SC_BIN},
    {ldcf_syntax_binary, SC_BIN},
    {ldcf_syntax_country, SC_COUNTRY_STRING | SC_CIS},
    {ldcf_syntax_facsimile, SC_TEL | SC_CIS},
    {ldcf_syntax_telex, SC_TEL | SC_CIS},
    {ldcf_syntax_telephone, SC_TEL | SC_CIS},
    {ldcf_syntax_numeric_string, SC_NUMERIC_STRING | SC_CIS},
    {ldcf_syntax_boolean, SC_BOOL},
    {ldcf_syntax_integer, SC_INT},
    {ldcf_syntax_generalized_time, SC_GT},
    {ldcf_syntax_utc_time, SC_UTCT},
};

struct rule_code {
    ldcf_known_rule rule;
    unsigned code;
};

constexpr rule_code equality_codes[] = {
    {ldcf_rule_case_exact, SC_CES},         {ldcf_rule_case_exact_ia5, SC_CES},
    {ldcf_rule_case_ignore, SC_CIS},        {ldcf_rule_case_ignore_ia5, SC_CIS},
    {ldcf_rule_octet_string, SC_CIS},       {ldcf_rule_oid, SC_CIS},
    {ldcf_rule_oid_first, SC_CIS},          {ldcf_rule_dn, SC_DN | SC_CIS},
    {ldcf_rule_generalized_time, SC_GT},    {ldcf_rule_integer, SC_INT},
    {ldcf_rule_integer_first, SC_INT},      {ldcf_rule_numeric_string, SC_NUMERIC_STRING | SC_CIS},
    {ldcf_rule_telephone, SC_TEL | SC_CIS}, {ldcf_rule_utc_time, SC_UTCT},
};

constexpr rule_code substring_codes[] = {
    {ldcf_rule_case_exact_substrings, SC_CES},
    {ldcf_rule_case_ignore_substrings, SC_CIS},
    {ldcf_rule_case_ignore_ia5_substrings, SC_CIS},
    {ldcf_rule_telephone_substrings, SC_TEL | SC_CIS},
    {ldcf_rule_numeric_string_substrings, SC_NUMERIC_STRING | SC_CIS},
};

constexpr rule_code ordering_codes[] = {
    {ldcf_rule_case_exact_ordering, SC_CES},      {ldcf_rule_case_ignore_ordering, SC_CIS},
    {ldcf_rule_dn_ordering, SC_DN | SC_CIS},      {ldcf_rule_numeric_string_ordering, SC_NUMERIC_STRING | SC_CIS},
    {ldcf_rule_generalized_time_ordering, SC_GT},
};

// By the rule that a definition's text led to, or by the text itself where it leads nowhere.
template <std::size_t count>
unsigned find_rule(const rule_code (&codes)[count], const csgl_string& text, const ldcf_matchrule& rule)
{
    for (const rule_code& known : codes) {
        if ((rule && rule.oid() == known.rule.oid) || text == known.rule.oid ||
            csgl_str_ci_compare(text, known.rule.name) == 0) {
            return known.code;
        }
    }
    return 0;
}

unsigned find_syntax(const csgl_string& oid)
{
    for (const syntax_code& known : syntax_codes) {
        if (oid == known.oid) {
            return known.code;
        }
    }
    return 0;
}

// Fills one record, step by step; a step gives false when the record can't be made, and has told why.
class info_filler {
public:
    info_filler(const ldcf_attrtype& attribute, asyntaxinfo& info) : attribute_(*attribute), info_(info) {}

    bool fill()
    {
        if (!fill_names() || !fill_table() || !fill_codes() || !fill_columns()) {
            return false;
        }
        Backend* be = ldcf_api_get_backend(g_backends, "rdbm");
        if (be != nullptr && be->be_fill_attr_info != nullptr) {
            be->be_fill_attr_info(&info_);
        }
        fill_index();
        info_.encryption = static_cast<std::int32_t>(attribute_.encryption());
        info_.secure_connection = attribute_.secure_connection() ? 1 : 0;
        info_.return_value = static_cast<std::int32_t>(attribute_.return_value());
        info_.non_matchable = attribute_.non_matchable() ? 1 : 0;
        return true;
    }

private:
    // A copy for the record, or null with the failure told.
    static char* copy(const char* text)
    {
        char* result = strdup(text);
        if (result == nullptr) {
            debug_error("ldcf_rdbm::fill_asyntaxinfostrdup failed!\n");
        }
        return result;
    }

    template <typename Add>
    bool add_name(const csgl_string& name, Add&& add)
    {
        heap_text text(copy(name));
        if (text == nullptr || add(&info_.names, text.get()) != 0) {
            return false;
        }
        static_cast<void>(text.release());
        return true;
    }

    bool fill_names()
    {
        for (const csgl_string& name : attribute_.names()) {
            if (!add_name(name, charray_add_sorted_by_len)) {
                return false;
            }
            info_.name_length = static_cast<std::int32_t>(std::strlen(info_.names[0]));
        }
        return add_name(attribute_.oid(), charray_add);
    }

    bool fill_table()
    {
        if (g_srvType == server_without_tables) {
            return true;
        }
        info_.table = copy(attribute_.table());
        if (info_.table == nullptr) {
            return false;
        }
        const char* dot = std::strchr(info_.table, '.');
        if (dot == nullptr) {
            return true;
        }
        char text[short_table_size];
        const char* short_name = info_.table;
        if (std::strlen(dot + 1) > longest_plain_table) {
            char suffix[8];
            if (unpack_int(ldcf_hash_name(dot + 1), suffix) != 0) {
                debug_error("ldcf_rdbm::fill_asyntaxinfo: unpack_int failed!\n");
                return false;
            }
            const auto qualifier = std::min(short_qualifier_length, static_cast<std::size_t>(dot - info_.table));
            vrn_snprintf(text, sizeof(text), "%.*s.%.*s%s", static_cast<int>(qualifier), info_.table,
                         static_cast<int>(short_table_front), dot + 1, suffix);
            short_name = text;
        }
        info_.short_table = copy(short_name);
        return info_.short_table != nullptr;
    }

    // A case-exact rule makes a text's syntax case-exact.
    void keep_case_if_exact(unsigned rule)
    {
        if (rule == SC_CES && (info_.syntax & SC_CIS) != 0) {
            info_.syntax = SC_CES;
        }
    }

    bool fill_codes()
    {
        const int class_index = static_cast<int>(attribute_.access_class());
        info_.access_class = class_index >= 0 && class_index <= 5 ? 1 << class_index : 1;
        info_.syntax = find_syntax(attribute_.syntax_oid());
        if (info_.syntax == 0) {
            debug_error("ldcf_rdbm::fill_ayntaxinfo: Invalid syntax: %s\n", attribute_.syntax_oid().c_str());
            return false;
        }
        info_.equality = find_rule(equality_codes, attribute_.equality(), attribute_.equality_rule());
        keep_case_if_exact(info_.equality);
        info_.substring = find_rule(substring_codes, attribute_.substr(), attribute_.substr_rule());
        keep_case_if_exact(info_.substring);
        info_.ordering = find_rule(ordering_codes, attribute_.ordering(), attribute_.ordering_rule());
        keep_case_if_exact(info_.ordering);
        return true;
    }

    static rdbm_col_info* make_column(const char* name)
    {
        heap_pointer<rdbm_col_info> column(static_cast<rdbm_col_info*>(std::calloc(1, sizeof(rdbm_col_info))));
        if (column == nullptr) {
            debug_error("ldcf_rdbm::fill_asyntaxinfordbm_col_info malloc failed!\n");
            return nullptr;
        }
        column->name = copy(name);
        return column->name == nullptr ? nullptr : column.release();
    }

    bool fill_columns()
    {
        const bool is_text_or_dn = (info_.syntax & text_or_dn) != 0;
        int length = attribute_.effective_length();
        if (length == 0 && is_text_or_dn) {
            length = indexable_length;
        }
        const csgl_string& name = attribute_.column();
        info_.attr = make_column(name);
        if (info_.attr == nullptr) {
            return false;
        }
        for (const char* system_column : system_columns) {
            info_.system_column = info_.system_column != 0 || name == system_column ? 1 : 0;
        }
        info_.attr_id = attribute_.attr_id();
        info_.attr_class = attribute_.attr_class();
        if (is_text_or_dn && length > longest_text_column) {
            debug_error("ldcf_rdbm::fill_asyntaxinfo():attr size %d exceed max longvarchar length %d\n", length,
                        longest_text_column);
            return false;
        }
        info_.attr->length = static_cast<std::uint16_t>(std::clamp<int>(length, 0, longest_column));
        return !is_text_or_dn || length <= indexable_length || info_.system_column != 0 || fill_trunc(name);
    }

    bool fill_trunc(const csgl_string& name)
    {
        char text[trunc_name_size];
        const auto front = std::min<std::size_t>(name.length(), trunc_name_front);
        vrn_strlcpy(text, name, front + 1);
        if (front < name.length()) {
            debug_trace("vrn_strlcpy: truncated attribute [%s] to [%s] myLen=%d (%d) chars\n", name.c_str(), text,
                        static_cast<int>(name.length()), static_cast<int>(front));
        }
        vrn_strlcat(text, trunc_suffix, sizeof(text));
        info_.trunc = make_column(text);
        if (info_.trunc == nullptr) {
            return false;
        }
        info_.trunc->length = indexable_length;
        return true;
    }

    void fill_index()
    {
        bool wanted = false;
        for (unsigned i = 0; i < ldcf_index_count; ++i) {
            wanted = wanted || attribute_.has_index(static_cast<ldcf_index>(i));
        }
        info_.index_action = wanted ? 1 : 0;
        debug_trace("%s", wanted ? "ldcf_rdbm: in CREATE_INDEX\n" : "ldcf_rdbm: in NO_ACTION\n");
    }

    const ldcf_attrtype_& attribute_;
    asyntaxinfo& info_;
};

void free_column(rdbm_col_info* column)
{
    if (column != nullptr) {
        std::free(column->name);
        std::free(column);
    }
}

// A record that never was in the name cache: readers may be in there while another's record fails.
void free_record(asyntaxinfo* info)
{
    charray_free(info->names);
    std::free(info->table);
    std::free(info->short_table);
    free_column(info->attr);
    free_column(info->trunc);
    while (info->back_end_list != nullptr) {
        std::free(std::exchange(info->back_end_list, info->back_end_list->next));
    }
    std::free(info);
}

bool add_class_name(objectclassinfo& info, const csgl_string& name)
{
    heap_text text(strdup(name));
    if (text == nullptr) {
        debug_error("ldcf_rdbm::fill_classinfostrdup failed!\n");
        return false;
    }
    utfToUpper(text.get());  // what isn't UTF-8 stays as it is from there on
    if (charray_add(&info.names, text.get()) != 0) {
        debug_error("ldcf_rdbm::fill_classinfo-- charray_add failed!\n");
        return false;
    }
    static_cast<void>(text.release());
    return true;
}

}  // namespace

std::uint32_t ldcf_rdbm::syntax_code(const csgl_string& oid)
{
    return find_syntax(oid);
}

asyntaxinfo* ldcf_rdbm::fill_asyntaxinfo(const ldcf_attrtype& attribute)
{
    auto* info = static_cast<asyntaxinfo*>(std::calloc(1, sizeof(asyntaxinfo)));
    if (info == nullptr) {
        debug_error("ldcf_rdbm::fill_asyntaxinfoasyntaxinfo malloc failed!\n");
        return nullptr;
    }
    info->type = attribute.get();
    if (!info_filler(attribute, *info).fill()) {
        free_record(info);
        return nullptr;
    }
    return info;
}

objectclassinfo* ldcf_rdbm::fill_classinfo(const ldcf_objclass& objclass)
{
    auto* info = static_cast<objectclassinfo*>(std::calloc(1, sizeof(objectclassinfo)));
    if (info == nullptr) {
        debug_error("ldcf_rdbm::fill_classinfordbm_class_info malloc failed!\n");
        return nullptr;
    }
    bool filled = true;
    for (const csgl_string& name : objclass->names()) {
        filled = filled && add_class_name(*info, name);
    }
    if (!filled || !add_class_name(*info, objclass.oid())) {
        delete_objectclassinfo(info);
        return nullptr;
    }
    return info;
}

void ldcf_rdbm::delete_asyntaxinfo(asyntaxinfo* info)
{
    if (info == nullptr) {
        return;
    }
    ldcf_hash_flush();  // a node there may point at the record
    free_record(info);
}

void ldcf_rdbm::delete_objectclassinfo(objectclassinfo* info)
{
    if (info != nullptr) {
        charray_free(info->names);
        std::free(info);
    }
}
