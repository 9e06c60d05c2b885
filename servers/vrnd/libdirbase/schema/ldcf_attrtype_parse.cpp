// Parsers of attribute types: the standard and the extended definition, and how the two meet in one body.
#include <cctype>
#include <cstring>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/schema/ldcf_attrtype.h"
#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

#define V3_KEYWORDS                                                                                       \
    "'NAME' 'DESC' 'OBSOLETE' 'SUP' 'EQUALITY' 'ORDERING' 'SUBSTR' 'SYNTAX' 'SINGLE-VALUE' 'COLLECTIVE' " \
    "'NO-USER-MODIFICATION' 'USAGE'"
#define XAN_KEYWORDS_OF_OLD "'DBNAME' 'ACCESS-CLASS' 'LENGTH' 'EQUALITY' 'ORDERING' 'SUBSTR' 'APPROX' 'REVERSE'"

namespace {

// A word of the grammar and what it stands for.
template <typename Value>
struct word {
    const char* text;
    Value value;
};

constexpr word<ldcf_usage> usages[] = {
    {"userApplications", ldcf_usage::user_applications},
    {"directoryOperation", ldcf_usage::directory_operation},
    {"distributedOperation", ldcf_usage::distributed_operation},
    {"dSAOperation", ldcf_usage::dsa_operation},
};

constexpr word<ldcf_access_class> access_classes[] = {
    {"NORMAL", ldcf_access_class::normal},     {"SENSITIVE", ldcf_access_class::sensitive},
    {"CRITICAL", ldcf_access_class::critical}, {"RESTRICTED", ldcf_access_class::restricted},
    {"SYSTEM", ldcf_access_class::system},     {"OBJECT", ldcf_access_class::object},
};

constexpr word<ldcf_encryption> encryptions[] = {
    {"SSHA", ldcf_encryption::ssha},
    {"AES-128", ldcf_encryption::aes_128},
    {"AES-192", ldcf_encryption::aes_192},
    {"AES-256", ldcf_encryption::aes_256},
};

constexpr word<ldcf_return_value> return_values[] = {
    {"encrypted", ldcf_return_value::encrypted},
    {"type-only", ldcf_return_value::type_only},
};

constexpr word<ldcf_index> indexes[] = {
    {"EQUALITY", ldcf_index_equality}, {"ORDERING", ldcf_index_ordering}, {"SUBSTR", ldcf_index_substr},
    {"APPROX", ldcf_index_approx},     {"REVERSE", ldcf_index_reverse},
};

template <typename Value, std::size_t count>
const word<Value>* find_word(const word<Value> (&words)[count], const csgl_string& text)
{
    for (const word<Value>& candidate : words) {
        if (csgl_str_ci_compare(candidate.text, text) == 0) {
            return &candidate;
        }
    }
    return nullptr;
}

// Reads a bare word that must be one of a list.
template <typename Value, std::size_t count>
Value read_word(ldcf_token_factory& factory, const word<Value> (&words)[count], const char* expected, int message_id,
                const char* expected_one_of)
{
    const ldcf_token token(factory, expected, token_descr, message_id);
    const word<Value>* found = find_word(words, token.text());
    if (found == nullptr) {
        factory.throw_exc(expected_one_of, LDCF_MSG_EXPECTED_ONE_OF);
    }
    return found->value;
}

constexpr unsigned keyword_mask = token_descr | token_right_paren;

}  // namespace

// One parser at work on one body.
class ldcf_attrtype_parser {
public:
    ldcf_attrtype_parser(ldcf_token_factory& factory, const ldcf_attrtype& attribute)
        : factory_(factory), attribute_(attribute), body_(*attribute)
    {
    }

    void read_v3();
    void read_xan();

    // The syntax-spec behind SYNTAX.
    void read_syntax();

private:
    bool read_v3_keyword(const ldcf_token& token);
    bool read_xan_keyword(const ldcf_token& token);
    void read_db_names();
    void read_syntax_length();
    void read_quoted_syntax(const csgl_string& text);

    ldcf_token_factory& factory_;
    ldcf_attrtype attribute_;
    ldcf_attrtype_& body_;
};

void ldcf_attrtype_parser::read_v3()
{
    constexpr char with_end[] = LDCF_EXPECTED_ONE_OF(V3_KEYWORDS " ')'");
    for (ldcf_token token(factory_, with_end, keyword_mask, LDCF_MSG_EXPECTED_ONE_OF); !token[token_right_paren];
         token.assign(factory_, with_end, keyword_mask, LDCF_MSG_EXPECTED_ONE_OF)) {
        if (!read_v3_keyword(token)) {
            factory_.throw_exc(LDCF_EXPECTED_ONE_OF(V3_KEYWORDS), LDCF_MSG_EXPECTED_ONE_OF);
        }
    }
}

bool ldcf_attrtype_parser::read_v3_keyword(const ldcf_token& token)
{
    if (token.is("NAME")) {
        body_.names_ = ldcf_stream::qdescrs(factory_, body_.primary_name_);
    } else if (token.is("DESC")) {
        body_.description_ = ldcf_stream::qdstring(factory_);
    } else if (token.is("OBSOLETE")) {
        body_.obsolete_ = true;
    } else if (token.is("SUP")) {
        body_.sup_ = ldcf_stream::oid(factory_);
    } else if (token.is("EQUALITY")) {
        body_.equality_ = ldcf_stream::oid(factory_);
    } else if (token.is("ORDERING")) {
        body_.ordering_ = ldcf_stream::oid(factory_);
    } else if (token.is("SUBSTR")) {
        body_.substr_ = ldcf_stream::oid(factory_);
    } else if (token.is("SYNTAX")) {
        read_syntax();
    } else if (token.is("SINGLE-VALUE")) {
        body_.single_value_ = true;
    } else if (token.is("COLLECTIVE")) {
        body_.collective_ = true;
    } else if (token.is("NO-USER-MODIFICATION")) {
        body_.user_modifiable_ = false;
    } else if (token.is("USAGE")) {
        body_.usage_ = read_word(
            factory_, usages, "expected usage specification" LDCF_NOT_FOUND_AT, LDCF_MSG_EXPECTED_USAGE,
            LDCF_EXPECTED_ONE_OF("'userApplications' 'directoryOperation' 'distributedOperation' 'dSAOperation'"));
    } else {
        return false;
    }
    return true;
}

void ldcf_attrtype_parser::read_xan()
{
    constexpr char with_end[] = LDCF_EXPECTED_ONE_OF(XAN_KEYWORDS_OF_OLD " ')'");
    for (ldcf_token token(factory_, with_end, keyword_mask, LDCF_MSG_EXPECTED_ONE_OF); !token[token_right_paren];
         token.assign(factory_, with_end, keyword_mask, LDCF_MSG_EXPECTED_ONE_OF)) {
        if (!read_xan_keyword(token)) {
            factory_.throw_exc(LDCF_EXPECTED_ONE_OF(XAN_KEYWORDS_OF_OLD " 'ENCRYPT' 'RETURN-VALUE' "
                                                                        "'SECURE-CONNECTION-REQUIRED' 'NONMATCHABLE'"),
                               LDCF_MSG_EXPECTED_ONE_OF);
        }
    }
}

bool ldcf_attrtype_parser::read_xan_keyword(const ldcf_token& token)
{
    if (const word<ldcf_index>* index = find_word(indexes, token.text()); index != nullptr) {
        body_.has_index_[index->value] = true;
        body_.index_length_[index->value] = ldcf_stream::optlen(factory_);
    } else if (token.is("DBNAME")) {
        read_db_names();
    } else if (token.is("ACCESS-CLASS")) {
        body_.access_class_ =
            read_word(factory_, access_classes, "expected ACCESS-CLASS specification" LDCF_NOT_FOUND_AT,
                      LDCF_MSG_EXPECTED_ACCESS_CLASS,
                      LDCF_EXPECTED_ONE_OF("'normal' 'sensitive' 'critical' 'restricted' 'system' 'object'"));
    } else if (token.is("LENGTH")) {
        body_.length_ = ldcf_stream::number(
            ldcf_token(factory_, LDCF_EXPECTED("number after 'LENGTH'"), token_number, LDCF_MSG_EXPECTED_NUMBER));
    } else if (token.is("ENCRYPT")) {
        body_.encryption_ =
            read_word(factory_, encryptions, "expected ENCRYPT specification" LDCF_NOT_FOUND_AT,
                      LDCF_MSG_EXPECTED_ENCRYPT, LDCF_EXPECTED_ONE_OF("'SSHA' 'AES-128' 'AES-192' 'AES-256'"));
    } else if (token.is("RETURN-VALUE")) {
        body_.return_value_ =
            read_word(factory_, return_values, "expected RETURN-VALUE specification" LDCF_NOT_FOUND_AT,
                      LDCF_MSG_EXPECTED_RETURN_VALUE, LDCF_EXPECTED_ONE_OF("'encrypted' 'type-only'"));
    } else if (token.is("SECURE-CONNECTION-REQUIRED")) {
        body_.secure_connection_ = true;
    } else if (token.is("NONMATCHABLE")) {
        body_.non_matchable_ = true;
    } else {
        return false;
    }
    return true;
}

void ldcf_attrtype_parser::read_db_names()
{
    body_.db_names_ = ldcf_stream::qdstrings(factory_);
    if (body_.db_names_.empty() || body_.db_names_.size() > 2) {
        factory_.throw_exc("expected one or two quoted strings (database table and/or column names)" LDCF_NOT_FOUND_AT,
                           LDCF_MSG_EXPECTED_DBNAME);
    }
}

void ldcf_attrtype_parser::read_syntax()
{
    const ldcf_token token(factory_);
    if (token[token_dotted_oid]) {
        body_.syntax_oid_ = token.text();
        read_syntax_length();
    } else if (token[token_qdstring]) {
        read_quoted_syntax(token.text());
    } else {
        ldcf_attrtype::throw_syntax_error(factory_);
    }
}

// "{number}", or nothing.
void ldcf_attrtype_parser::read_syntax_length()
{
    body_.syntax_length_ = 0;  // of an earlier SYNTAX
    if (!ldcf_token(factory_)[token_left_brace]) {
        factory_.return_token();
        return;
    }
    body_.syntax_length_ = ldcf_stream::number(
        ldcf_token(factory_, LDCF_EXPECTED("number after '{'"), token_number, LDCF_MSG_EXPECTED_NUMBER));
    ldcf_token(factory_, LDCF_EXPECTED("'}' after '{' <number>"), token_right_brace, LDCF_MSG_EXPECTED_BRACE);
}

// Inside quotes every fault is that of the whole: no numeric oid with or without a length.
void ldcf_attrtype_parser::read_quoted_syntax(const csgl_string& text)
{
    ldcf_token_factory inner(text, csgl_string());
    csgl_string oid;
    int length = 0;
    bool length_inside = false;
    try {
        const ldcf_token oid_token(inner);
        bool valid = oid_token[token_dotted_oid];
        oid = oid_token.text();
        if (valid && !inner.empty()) {
            length_inside = true;
            valid = ldcf_token(inner)[token_left_brace];
            const ldcf_token number(inner);
            length = ldcf_stream::number(number);
            valid = valid && number[token_number] && ldcf_token(inner)[token_right_brace] && inner.empty();
        }
        if (!valid) {
            oid = csgl_string();
        }
    } catch (const exc_not_enough_memory_t&) {
        throw;
    } catch (const exc_t&) {
        oid = csgl_string();
    }
    if (oid.empty()) {
        ldcf_attrtype::throw_syntax_error(factory_);
    }
    body_.syntax_oid_ = oid;
    if (length_inside) {
        body_.syntax_length_ = length;
    } else {
        read_syntax_length();
    }
}

namespace {

csgl_string check_oid(ldcf_token_factory& factory)
{
    [[maybe_unused]] const ldcf_token opening(factory, LDCF_EXPECTED("'('"), token_left_paren, LDCF_MSG_EXPECTED);
    return ldcf_stream::oid(factory);
}

// True when two standard definitions of one oid agree in all that must.
bool agree(const ldcf_attrtype_& a, const ldcf_attrtype_& b)
{
    return a.description() == b.description() && a.obsolete() == b.obsolete() && a.sup() == b.sup() &&
           a.equality() == b.equality() && a.ordering() == b.ordering() && a.substr() == b.substr() &&
           a.syntax_oid() == b.syntax_oid() && a.single_value() == b.single_value() &&
           a.collective() == b.collective() && a.user_modifiable() == b.user_modifiable() && a.usage() == b.usage();
}

[[noreturn]] void throw_invalid_state()
{
    throw exc_invalid_state_t(__FILE__, __LINE__, "exc_invalid_state", 0);
}

}  // namespace

void ldcf_attrtype::parse_v3(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_attrtype>& map)
{
    const csgl_string oid = check_oid(factory);
    const ldcf_attrtype found = ldcf_find(map, oid);
    const bool alternate = found && (found->state_ == ldcf_attrtype_state::v3_defined ||
                                     found->state_ == ldcf_attrtype_state::both_defined);
    ldcf_attrtype attribute = found;
    if (alternate) {
        if (csgl_string::compare(factory.file(), found->v3_file_) != 0) {
            factory.throw_exc(ldcf_join("all alternate definitions of same [p[" LDCF_KIND_ATTRIBUTE_TYPE
                                        "]p] must be in a single file: ",
                                        ldcf_quoted_parameter(oid), " is also defined in [p[", found->v3_file_, "]p]"),
                              LDCF_MSG_ALTERNATE_ELSEWHERE);
        }
        debug_trace("existing oid = %s NOT the 1st v3 definition", oid.c_str());
    } else if (found) {
        debug_trace("existing oid = %s 1st v3 definition", oid.c_str());
    }
    if (!found || alternate) {
        attribute = ldcf_attrtype(new ldcf_attrtype_(oid));
    }
    ldcf_attrtype_& body = *attribute;
    body.v3_file_ = factory.file();
    body.v3_string_.clear();
    ldcf_attrtype_parser(factory, attribute).read_v3();

    if (body.primary_name_.empty()) {
        body.primary_name_ = body.oid_;
    }
    for (const csgl_string& name : body.names_) {
        if (map.count(name) != 0) {
            factory.throw_exc(ldcf_join("[p[" LDCF_KIND_ATTRIBUTE_TYPE "]p] ", ldcf_quoted_parameter(name),
                                        " has already been defined"),
                              LDCF_MSG_ALREADY_DEFINED);
        }
    }
    body.identity_ = ldcf_identify_attribute(body.v3_file_, body.primary_name_, body.usage_);
    switch (body.state_) {
    case ldcf_attrtype_state::not_defined: body.state_ = ldcf_attrtype_state::v3_defined; break;
    case ldcf_attrtype_state::xan_defined: body.state_ = ldcf_attrtype_state::both_defined; break;
    default: throw_invalid_state();
    }

    if (alternate) {
        if (!agree(body, *found)) {
            factory.throw_exc(ldcf_join("inconsistent [p[attribute types]p] ",
                                        ldcf_quoted_parameter(body.primary_name_), " and ",
                                        ldcf_quoted_parameter(found->primary_name_), " (with OID [p[", oid, "]p])"),
                              LDCF_MSG_ALTERNATE_DIFFERS);
        }
        ldcf_names all_names = found->names_;
        all_names.insert(body.names_.begin(), body.names_.end());
        ldcf_enter(map, oid, body.names_, found);
        if (found->names_.empty()) {  // was known by its oid only, which is no name that a definition could give
            found->primary_name_ = body.primary_name_;
            found->identity_ = body.identity_;
        }
        found->names_.swap(all_names);
        found->v3_string_.clear();
        return;
    }
    ldcf_enter(map, oid, body.names_, attribute);
}

void ldcf_attrtype::parse_xan(ldcf_token_factory& factory, ldcf_map_name_to<ldcf_attrtype>& map)
{
    const csgl_string oid = check_oid(factory);
    const ldcf_attrtype found = ldcf_find(map, oid);
    if (found &&
        (found->state_ == ldcf_attrtype_state::xan_defined || found->state_ == ldcf_attrtype_state::both_defined)) {
        factory.throw_exc(
            ldcf_join("attribute type ", ldcf_quoted_parameter(oid), " already has an XAN extended definition"),
            LDCF_MSG_EXTENDED_TWICE);
    }
    const ldcf_attrtype attribute = found ? found : ldcf_attrtype(new ldcf_attrtype_(oid));
    ldcf_attrtype_& body = *attribute;
    body.xan_file_ = factory.file();
    body.xan_string_.clear();
    ldcf_attrtype_parser(factory, attribute).read_xan();

    switch (body.state_) {
    case ldcf_attrtype_state::not_defined: body.state_ = ldcf_attrtype_state::xan_defined; break;
    case ldcf_attrtype_state::v3_defined: body.state_ = ldcf_attrtype_state::both_defined; break;
    default: throw_invalid_state();
    }
    body.has_extended_ = true;
    if (!found) {
        map[oid] = attribute;
    }
}

void ldcf_attrtype::parse_attrtype_syntax(ldcf_attrtype* attribute, ldcf_token_factory& factory)
{
    ldcf_attrtype_parser(factory, *attribute).read_syntax();
}

void ldcf_attrtype::throw_syntax_error(ldcf_token_factory& factory)
{
    factory.return_token();
    factory.throw_exc(LDCF_EXPECTED("numeric object ID or numeric object OID{ <number>}"), LDCF_MSG_EXPECTED);
}

namespace {

constexpr char oid_prefix[] = "oid.";
constexpr std::size_t oid_prefix_length = sizeof(oid_prefix) - 1;

// True when a standard definition is that of `attribute`, a numeric oid or a name.
bool defines(const char* definition, const char* attribute, bool numeric)
{
    ldcf_token_factory factory(definition, csgl_string());
    const csgl_string oid = check_oid(factory);
    if (numeric) {
        return std::strcmp(oid, attribute) == 0;
    }
    constexpr char expected[] = LDCF_EXPECTED_ONE_OF("'NAME' ')'");
    ldcf_token token(factory, expected, keyword_mask, LDCF_MSG_EXPECTED_ONE_OF);
    while (!token[token_right_paren] && !token.is("NAME")) {
        token.assign(factory, expected, keyword_mask, LDCF_MSG_EXPECTED_ONE_OF);
    }
    if (token[token_right_paren]) {
        return false;
    }
    csgl_string primary;
    return ldcf_stream::qdescrs(factory, primary).count(attribute) != 0;
}

}  // namespace

bool ldcf_attrtype::attributeTypesContainsAttr(char** definitions, char* attribute)
{
    if (definitions == nullptr || attribute == nullptr) {
        return false;
    }
    const char* sought = attribute;
    bool numeric = false;
    if (strncasecmp(sought, oid_prefix, oid_prefix_length) == 0) {
        sought += oid_prefix_length;
        numeric = true;
    } else {
        numeric = *sought >= '0' && *sought <= '9';
    }
    for (char** definition = definitions; *definition != nullptr; ++definition) {
        try {
            if (defines(*definition, sought, numeric)) {
                debug_trace("ldcf_attrtype::attributeTypesContainsAttr: attribute %s found in the given attributeType "
                            "list\n",
                            attribute);
                return true;
            }
        } catch (const exc_t& failure) {
            debug_trace("ldcf_attrtype::attributeTypesContainsAttr: definition passed over: %s\n",
                        failure.message().text());
        }
    }
    return false;
}

bool attributeTypesContainsAttr(char** definitions, char* attribute)
{
    return ldcf_attrtype::attributeTypesContainsAttr(definitions, attribute);
}
