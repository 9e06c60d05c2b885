// The sheet of an attribute type: what it says, what it inherits and from where, and what the store makes of it.
#include <cinttypes>
#include <cstdio>

#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/schema/asyntaxinfo.h"
#include "tools/dirbase/describe_definition.h"

namespace dirbase_tool {

namespace {

const char* usage_word(ldcf_usage usage)
{
    switch (usage) {
    case ldcf_usage::directory_operation: return "directoryOperation";
    case ldcf_usage::distributed_operation: return "distributedOperation";
    case ldcf_usage::dsa_operation: return "dSAOperation";
    case ldcf_usage::user_applications: break;
    }
    return "userApplications";
}

const char* access_class_word(ldcf_access_class access_class)
{
    switch (access_class) {
    case ldcf_access_class::sensitive: return "SENSITIVE";
    case ldcf_access_class::critical: return "CRITICAL";
    case ldcf_access_class::restricted: return "RESTRICTED";
    case ldcf_access_class::system: return "SYSTEM";
    case ldcf_access_class::object: return "OBJECT";
    case ldcf_access_class::normal: break;
    }
    return "NORMAL";
}

const char* encryption_word(ldcf_encryption encryption)
{
    switch (encryption) {
    case ldcf_encryption::ssha: return "SSHA";
    case ldcf_encryption::aes_128: return "AES-128";
    case ldcf_encryption::aes_192: return "AES-192";
    case ldcf_encryption::aes_256: return "AES-256";
    case ldcf_encryption::none: break;
    }
    return "";
}

const char* return_value_word(ldcf_return_value return_value)
{
    switch (return_value) {
    case ldcf_return_value::encrypted: return "encrypted";
    case ldcf_return_value::type_only: return "type-only";
    case ldcf_return_value::cleartext: break;
    }
    return "cleartext";
}

constexpr const char* index_words[ldcf_index_count] = {"EQUALITY", "ORDERING", "SUBSTR", "APPROX", "REVERSE"};

// Nearest first.
std::vector<std::string> supertypes_of(const ldcf_attrtype& attribute)
{
    std::vector<std::string> names;
    for (ldcf_attrtype type = attribute->supertype(); type; type = type->supertype()) {
        names.push_back(text_of(type.name()));
    }
    return names;
}

// The supertype that gives an item itself; empty when the type does.
std::string giver_of(const ldcf_attrtype& attribute, bool (ldcf_attrtype_::*inherited)() const)
{
    ldcf_attrtype type = attribute;
    while (((*type).*inherited)() && type->supertype()) {
        type = type->supertype();
    }
    return type == attribute ? "" : text_of(type.name());
}

// A line for something that may be inherited, such as "caseIgnoreMatch (2.5.13.2), inherited from name".
void add_inheritable(definition_sheet& sheet, const std::string& label, const std::string& key,
                     const std::string& value, const std::string& remark, const std::string& giver)
{
    if (value.empty()) {
        sheet.add(label, key, value);
        return;
    }
    std::string text = value;
    json member = {{"value", value}};
    if (!remark.empty()) {
        text += " (" + remark + ")";
        member[key == "syntax" ? "description" : "oid"] = remark;
    }
    if (!giver.empty()) {
        text += ", inherited from " + giver;
        member["inheritedFrom"] = giver;
    }
    sheet.add(label, text, key, std::move(member));
}

void add_rule(definition_sheet& sheet, const std::string& label, const std::string& key, const ldcf_attrtype& attribute,
              const ldcf_matchrule& rule, bool (ldcf_attrtype_::*inherited)() const)
{
    if (rule) {
        add_inheritable(sheet, label, key, text_of(rule.name()), text_of(rule.oid()), giver_of(attribute, inherited));
    } else {
        sheet.add(label, key, std::string());
    }
}

// Where the effective length comes from: the type's own LENGTH or SYNTAX, else a supertype's, else a default.
std::string length_source(const ldcf_attrtype& attribute)
{
    ldcf_attrtype type = attribute;
    while (type->length() == 0 && type->syntax_length() == 0 && type->supertype() &&
           type->supertype()->effective_length() != 0) {
        type = type->supertype();
    }
    std::string source = "by default for the syntax";
    if (type->length() != 0) {
        source = "from LENGTH of the extended definition";
    } else if (type->syntax_length() != 0) {
        source = "from SYNTAX";
    }
    return type == attribute ? source : source + " of " + text_of(type.name());
}

// How the server holds or compares values, such as "text without regard to case (0x001)".
struct code_words {
    std::uint32_t code;
    const char* words;
};

constexpr code_words syntax_code_words[] = {
    {SC_CIS, "text without regard to case"},
    {SC_CES, "text"},
    {SC_BIN, "bytes"},
    {SC_TEL | SC_CIS, "telephone number"},
    {SC_DN | SC_CIS, "distinguished name"},
    {SC_INT, "integer"},
    {SC_BOOL, "boolean"},
    {SC_GT, "generalized time"},
    {SC_UTCT, "UTC time"},
    {SC_BIT_STRING | SC_CIS, "bit string"},
    {SC_NUMERIC_STRING | SC_CIS, "numeric string"},
    {SC_COUNTRY_STRING | SC_CIS, "country"},
};

void add_code(definition_sheet& sheet, const std::string& label, const std::string& key, std::uint32_t code)
{
    std::string words;
    for (const code_words& known : syntax_code_words) {
        words = known.code == code ? known.words : words;
    }
    char number[16];
    std::snprintf(number, sizeof number, "0x%03" PRIx32, code);
    sheet.add(label, words.empty() ? "none" : words + " (" + number + ")", key,
              words.empty() ? json() : json{{"value", words}, {"code", code}});
}

void add_column(definition_sheet& sheet, const std::string& label, const std::string& key, const rdbm_col_info* column)
{
    if (column == nullptr) {
        sheet.add(label, key, std::string());
        return;
    }
    const std::string length = column->length == 0 ? "no limit" : std::to_string(column->length) + " bytes";
    sheet.add(label, std::string(column->name) + ", " + length, key,
              {{"name", column->name}, {"length", column->length}});
}

// The flat record, which is what the server works by.
void add_record(definition_sheet& sheet, const ldcf_attrtype& attribute)
{
    const asyntaxinfo* info = attribute.info();
    if (info == nullptr) {
        sheet.add("values held as", "nothing: the server can't compare values of this syntax, or store such long ones",
                  "heldAs", json());
        sheet.add("table", "table", text_of(attribute->table()));
        sheet.add("column", text_of(attribute->column()), "column", {{"name", text_of(attribute->column())}});
        return;
    }
    add_code(sheet, "values held as", "heldAs", info->syntax);
    add_code(sheet, "equality compares", "equalityCompares", info->equality);
    add_code(sheet, "substrings compares", "substringsCompares", info->substring);
    add_code(sheet, "ordering compares", "orderingCompares", info->ordering);
    sheet.add("table", "table", text_of(attribute->table()));
    sheet.add("short table", "shortTable", std::string(info->short_table == nullptr ? "" : info->short_table));
    add_column(sheet, "column", "column", info->attr);
    add_column(sheet, "truncated column", "truncatedColumn", info->trunc);
}

void add_store(definition_sheet& sheet, const ldcf_attrtype& attribute)
{
    add_record(sheet, attribute);
    std::vector<std::string> indexes;
    for (unsigned i = 0; i < ldcf_index_count; ++i) {
        const auto index = static_cast<ldcf_index>(i);
        if (attribute->has_index(index)) {
            const int length = attribute->index_length(index);
            indexes.push_back(index_words[i] + (length > 0 ? " " + std::to_string(length) : std::string()));
        }
    }
    sheet.add("indexes", "indexes", indexes);
    sheet.add("access class", "accessClass", std::string(access_class_word(attribute->access_class())));
    sheet.add("encryption", "encryption", std::string(encryption_word(attribute->encryption())));
    sheet.add("may be encrypted", "mayBeEncrypted", attribute->may_be_encrypted());
    sheet.add("returned as", "returnedAs", std::string(return_value_word(attribute->return_value())));
    sheet.add("secure connection", "secureConnection", attribute->secure_connection());
    sheet.add("usable in filters", "usableInFilters", !attribute->non_matchable());
    sheet.add("number and class", std::to_string(attribute->attr_id()) + ", " + std::to_string(attribute->attr_class()),
              "attributeNumber", attribute->attr_id());
    sheet.add_member("attributeClass", attribute->attr_class());
}

}  // namespace

definition_sheet describe(const ldcf_attrtype& attribute, const ldcf_schema& /*schema*/,
                          const schema_directory& directory)
{
    definition_sheet sheet(LDCF_KIND_ATTRIBUTE_TYPE, text_of(attribute.name()));
    sheet.add("oid", "oid", text_of(attribute.oid()));
    sheet.add("names", "names", names_of(attribute));
    sheet.add("description", "description", text_of(attribute->description()));
    sheet.add("obsolete", "obsolete", attribute->obsolete());
    sheet.add("supertypes", "supertypes", supertypes_of(attribute));
    sheet.add("subtypes", "subtypes", sorted_names(attribute->subtypes()));

    add_rule(sheet, "equality rule", "equality", attribute, attribute->equality_rule(),
             &ldcf_attrtype_::equality_inherited);
    add_rule(sheet, "ordering rule", "ordering", attribute, attribute->ordering_rule(),
             &ldcf_attrtype_::ordering_inherited);
    add_rule(sheet, "substrings rule", "substrings", attribute, attribute->substr_rule(),
             &ldcf_attrtype_::substr_inherited);
    add_inheritable(sheet, "syntax", "syntax", text_of(attribute->syntax_oid()),
                    text_of(attribute->syntax()->description()),
                    giver_of(attribute, &ldcf_attrtype_::syntax_inherited));

    const int length = attribute->effective_length();
    const std::string source = length_source(attribute);
    sheet.add("effective length", (length == 0 ? "no limit" : std::to_string(length)) + ", " + source,
              "effectiveLength", {{"value", length}, {"source", source}});
    sheet.add("single value", "singleValue", attribute->single_value());
    sheet.add("collective", "collective", attribute->collective());
    sheet.add("user modification", "userModification", attribute->user_modifiable());
    sheet.add("usage", "usage", std::string(usage_word(attribute->usage())));
    add_store(sheet, attribute);
    sheet.add("file", "file", directory.name_of(text_of(attribute->v3_file())));
    if (attribute->has_extended()) {
        sheet.add("extended in file", "extendedFile", directory.name_of(text_of(attribute->xan_file())));
    }
    sheet.add("definition", "definition", text_of(attribute.v3_string()));
    sheet.add("extended definition", "extendedDefinition", text_of(attribute.xan_string()));
    return sheet;
}

}  // namespace dirbase_tool
