// Attribute types: text forms, comparison and copies. Parsing stands in ldcf_attrtype_parse.cpp, completion in
// ldcf_attrtype_complete.cpp.
#include "servers/vrnd/libdirbase/schema/ldcf_attrtype.h"

#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

namespace {

void append_item(csgl_string& text, const char* keyword, const csgl_string& value)
{
    text.append(keyword).append(" ").append(value).append(" ");
}

void append_number(csgl_string& text, const char* keyword, int value)
{
    append_item(text, keyword, ldcf_number(value));
}

void append_flag(csgl_string& text, bool flag, const char* keyword)
{
    if (flag) {
        text.append(keyword);
    }
}

const char* usage_form(ldcf_usage usage)
{
    switch (usage) {
    case ldcf_usage::directory_operation: return "USAGE directoryOperation ";
    case ldcf_usage::distributed_operation: return "USAGE distributedOperation ";
    case ldcf_usage::dsa_operation: return "USAGE dSAOperation ";
    case ldcf_usage::user_applications: break;
    }
    return "";
}

const char* access_class_form(ldcf_access_class access_class)
{
    switch (access_class) {
    case ldcf_access_class::normal: return "ACCESS-CLASS NORMAL ";
    case ldcf_access_class::sensitive: return "ACCESS-CLASS SENSITIVE ";
    case ldcf_access_class::critical: return "ACCESS-CLASS CRITICAL ";
    case ldcf_access_class::restricted: return "ACCESS-CLASS RESTRICTED ";
    case ldcf_access_class::system: return "ACCESS-CLASS SYSTEM ";
    case ldcf_access_class::object: return "ACCESS-CLASS OBJECT ";
    }
    return "";
}

const char* encryption_form(ldcf_encryption encryption)
{
    switch (encryption) {
    case ldcf_encryption::ssha: return "ENCRYPT SSHA ";
    case ldcf_encryption::aes_128: return "ENCRYPT AES-128 ";
    case ldcf_encryption::aes_192: return "ENCRYPT AES-192 ";
    case ldcf_encryption::aes_256: return "ENCRYPT AES-256 ";
    case ldcf_encryption::none: break;
    }
    return "";
}

const char* return_value_form(ldcf_return_value return_value)
{
    switch (return_value) {
    case ldcf_return_value::encrypted: return "RETURN-VALUE encrypted ";
    case ldcf_return_value::type_only: return "RETURN-VALUE type-only ";
    case ldcf_return_value::cleartext: break;
    }
    return "";
}

constexpr const char* index_keywords[ldcf_index_count] = {"EQUALITY ", "ORDERING ", "SUBSTR ", "APPROX ", "REVERSE "};

void append_db_names(csgl_string& text, const csgl_vector<csgl_string>& names)
{
    if (names.size() == 1) {
        text.append("DBNAME '").append(names[0]).append("' ");
    } else if (names.size() == 2) {
        text.append("DBNAME ( '").append(names[0]).append("' '").append(names[1]).append("' ) ");
    }
}

csgl_string with_underscores(const csgl_string& name)
{
    csgl_string result("");
    for (const char* c = name.c_str(); *c != '\0'; ++c) {
        result.append(*c == '-' ? "_" : c, 1);
    }
    return result;
}

bool same_oid(const csgl_string& a, const csgl_string& b)
{
    return csgl_str_ci_compare(a, b) == 0;
}

// True when two resolved references are both absent or lead to the same oid.
template <typename Handle>
bool same_reference(const Handle& a, const Handle& b)
{
    if (!a || !b) {
        return !a && !b;
    }
    return same_oid(a.oid(), b.oid());
}

}  // namespace

const csgl_string& ldcf_attrtype_::v3_string() const
{
    return v3_string_.get([this] {
        csgl_string text = ldcf_join("( ", oid_, " ");
        text.append(ldcf_stream::qdescrs("NAME", names_, primary_name_.empty() ? oid_ : primary_name_));
        if (!description_.empty()) {
            text.append("DESC '").append(description_).append("' ");
        }
        append_flag(text, obsolete_, "OBSOLETE ");
        if (!sup_.empty()) {
            append_item(text, "SUP", sup_);
        }
        if (!equality_.empty() && !equality_inherited_) {
            append_item(text, "EQUALITY", equality_);
        }
        if (!ordering_.empty() && !ordering_inherited_) {
            append_item(text, "ORDERING", ordering_);
        }
        if (!substr_.empty() && !substr_inherited_) {
            append_item(text, "SUBSTR", substr_);
        }
        if (!syntax_oid_.empty() && !syntax_inherited_) {
            text.append("SYNTAX ").append(syntax_oid_);
            if (syntax_length_ != 0) {
                text.append("{").append(ldcf_number(syntax_length_)).append("}");
            }
            text.append(" ");
        }
        append_flag(text, single_value_, "SINGLE-VALUE ");
        append_flag(text, collective_, "COLLECTIVE ");
        append_flag(text, !user_modifiable_, "NO-USER-MODIFICATION ");
        text.append(usage_form(usage_));
        return text.append(")");
    });
}

const csgl_string& ldcf_attrtype_::v3_string_inherited() const
{
    return v3_string_inherited_.get([this] {
        csgl_string text("( ");
        if (equality_inherited_ && !equality_.empty()) {
            append_item(text, "EQUALITY", equality_);
        }
        if (ordering_inherited_ && !ordering_.empty()) {
            append_item(text, "ORDERING", ordering_);
        }
        if (substr_inherited_ && !substr_.empty()) {
            append_item(text, "SUBSTR", substr_);
        }
        if (syntax_inherited_) {
            append_item(text, "SYNTAX", syntax_oid_);
        }
        if (syntax_length_ == 0 && effective_length_ != 0) {
            append_number(text, "LENGTH", effective_length_);
        }
        return text.append(")");
    });
}

bool ldcf_attrtype_::v3_inherited() const
{
    const bool anything = equality_inherited_ || ordering_inherited_ || substr_inherited_ || syntax_inherited_;
    if (!inherited_asked_.raised() && !anything && syntax_length_ != 0) {
        return false;
    }
    inherited_asked_.raise();
    return true;
}

// What the two extended forms have in common: the indexes and the protection.
void ldcf_attrtype_::append_store_form(csgl_string& text) const
{
    for (unsigned i = 0; i < ldcf_index_count; ++i) {
        if (has_index_[i]) {
            text.append(index_keywords[i]);
            if (index_length_[i] > 0) {
                text.append(ldcf_number(index_length_[i])).append(" ");
            }
        }
    }
    text.append(encryption_form(encryption_)).append(return_value_form(return_value_));
    append_flag(text, secure_connection_, "SECURE-CONNECTION-REQUIRED ");
    append_flag(text, non_matchable_, "NONMATCHABLE ");
    text.append(")");
}

const csgl_string& ldcf_attrtype_::xan_string() const
{
    return xan_string_.get([this] {
        if (!has_extended_) {
            return csgl_string();
        }
        csgl_string text = ldcf_join("( ", oid_, " ");
        append_db_names(text, db_names_);
        if (access_class_ != ldcf_access_class::normal) {
            text.append(access_class_form(access_class_));
        }
        if (length_ > 0) {
            append_number(text, "LENGTH", length_);
        }
        append_store_form(text);
        return text;
    });
}

csgl_string ldcf_attrtype_::xan_string_with_default() const
{
    csgl_string text = ldcf_join("( ", oid_, " ");
    if (db_names_.empty()) {
        text.append("DBNAME ( '").append(with_underscores(primary_name_)).append("' '").append(column_).append("' ) ");
    } else {
        append_db_names(text, db_names_);
    }
    text.append(access_class_form(access_class_));
    if (length_ > 0) {
        append_number(text, "LENGTH", length_);
    } else if (effective_length_ > 0) {
        append_number(text, "LENGTH", effective_length_);
    }
    append_store_form(text);
    return text;
}

ldcf_attrtype ldcf_attrtype::clone() const
{
    return ldcf_attrtype(new ldcf_attrtype_(**this));
}

// The number and class of a type depend on its home file, too.
void ldcf_attrtype::v3_file(const csgl_string& file)
{
    ldcf_attrtype_& body = **this;
    body.v3_file_ = file;
    body.identity_ = ldcf_identify_attribute(file, body.primary_name_, body.usage_);
}

void ldcf_attrtype::replace(ldcf_attrtype& other)
{
    other.v3_file(get()->v3_file_);
    other->xan_file_ = get()->xan_file_;
    **this = *other;
}

void ldcf_attrtype::retarget(const ldcf_translation<ldcf_attrtype>& attributes,
                             const ldcf_translation<ldcf_matchrule>& /*rules*/,
                             const ldcf_translation<ldcf_syntax>& syntaxes)
{
    ldcf_attrtype_& body = **this;
    body.syntax_ = ldcf_translate(syntaxes, body.syntax_);
    body.supertype_ = ldcf_translate(attributes, body.supertype_);
    body.subtypes_ = ldcf_translate(attributes, body.subtypes_);
}

bool ldcf_attrtype::v3_syntax_equal(const ldcf_attrtype& other) const
{
    const ldcf_attrtype_& a = **this;
    const ldcf_attrtype_& b = *other;
    return same_oid(a.oid_, b.oid_) && csgl_str_ci_compare(a.primary_name_, b.primary_name_) == 0 &&
           ldcf_names_equal(a.names_, b.names_) && csgl_str_ci_compare(a.sup_, b.sup_) == 0 &&
           a.obsolete_ == b.obsolete_ && a.effective_length_ == b.effective_length_ &&
           a.single_value_ == b.single_value_ && a.collective_ == b.collective_ &&
           a.user_modifiable_ == b.user_modifiable_ && a.usage_ == b.usage_ &&
           same_reference(a.equality_rule_, b.equality_rule_) && same_reference(a.ordering_rule_, b.ordering_rule_) &&
           same_reference(a.substr_rule_, b.substr_rule_) && same_reference(a.syntax_, b.syntax_);
}

bool ldcf_attrtype::xan_syntax_equal(const ldcf_attrtype& other) const
{
    const ldcf_attrtype_& a = **this;
    const ldcf_attrtype_& b = *other;
    if (!a.has_extended_ || !b.has_extended_) {
        return a.has_extended_ == b.has_extended_;
    }
    const auto db_name = [](const ldcf_attrtype_& body, std::size_t index) {
        return index < body.db_names_.size() ? body.db_names_[index] : csgl_string();
    };
    return same_oid(a.oid_, b.oid_) && csgl_str_ci_compare(db_name(a, 0), db_name(b, 0)) == 0 &&
           csgl_str_ci_compare(db_name(a, 1), db_name(b, 1)) == 0 && a.access_class_ == b.access_class_;
}

bool ldcf_attrtype_set_equal(const csgl_set<ldcf_attrtype>& a, const csgl_set<ldcf_attrtype>& b)
{
    if (a.size() != b.size()) {
        return false;
    }
    const auto names_of = [](const csgl_set<ldcf_attrtype>& types) {
        ldcf_names names;
        for (const ldcf_attrtype& type : types) {
            names.insert(type.name());
        }
        return names;
    };
    return ldcf_names_equal(names_of(a), names_of(b));
}

const char* ldcf_attrtype_get_oid(const ldcf_map_name_to<ldcf_attrtype>& map, const char* name)
{
    const auto found = name == nullptr ? map.end() : map.find(name);
    return found == map.end() ? nullptr : found->second.oid().c_str();
}
