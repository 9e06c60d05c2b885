// Entries of LDIF files: see ldif_entry.h.
#include "tools/dirbase/ldif_entry.h"

#include <strings.h>

#include <algorithm>
#include <cstring>
#include <new>
#include <unordered_map>
#include <unordered_set>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_expand.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_check.h"
#include "tools/dirbase/data_commands.h"

namespace dirbase_tool {

namespace {

using kind = ldif_fault_kind;

constexpr char binary_option[] = ";binary";

// Ends the work when a result says that memory ran out; gives it back otherwise.
int not_without_memory(int result)
{
    if (result == LDAP_NO_MEMORY) {
        throw std::bad_alloc();
    }
    return result;
}

std::string_view value_of(const ldif_line& line)
{
    return {line.value, line.length};
}

// The values of attributes that are compared byte for byte. The library compares such a value with each that is there,
// which takes too long for very many.
using byte_values = std::unordered_map<const Attribute*, std::unordered_set<std::string_view>>;

// Adds the value of a line.
//
//   normalize  whether it has to be of its syntax, and is left out when the attribute has it
int merge(Entry& entry, const ldif_line& line, bool normalize)
{
    berval value = {line.length, line.value};
    berval* values[] = {&value, nullptr};
    return not_without_memory(attr_merge(&entry, line.type, values, normalize ? 1 : 0, normalize ? 1 : 0, line.info));
}

// Adds the value of a line as it is, unless it is among those that were added so.
int merge_bytes(Entry& entry, const ldif_line& line, byte_values& known)
{
    berval* none[] = {nullptr};
    const int result = not_without_memory(attr_merge(&entry, line.type, none, 0, 0, line.info));  // makes the record
    if (result != LDAP_SUCCESS || !known[attr_find(&entry, line.type, 0, line.info)].insert(value_of(line)).second) {
        return result;
    }
    return merge(entry, line, false);
}

// What a value of a syntax has to be.
const char* words_of_syntax(std::uint32_t syntax)
{
    const char* const words = fault_of_syntax(syntax);
    return words != nullptr ? words : "is refused by the syntax of the attribute";
}

// Adds the values of an entry one after the other, and says what an addition would have against them.
class value_check {
public:
    value_check(Entry& entry, ldif_text& text, ldif_fault_list& faults) : entry_(entry), text_(text), faults_(faults) {}

    // False when the entry is too large to go on.
    bool run();

    // Whether values of an attribute were left out because of a fault.
    bool has_spoilt(const asyntaxinfo* info) const
    {
        return std::find(spoilt_.begin(), spoilt_.end(), info) != spoilt_.end();
    }

private:
    bool look_up(ldif_line& line);
    bool is_option_good(const ldif_line& line);
    bool add(ldif_line& line);
    void tell_duplicate(const ldif_line& line);
    void spoil(const ldif_line& line, kind what, const std::string& reason);

    Entry& entry_;
    ldif_text& text_;
    ldif_fault_list& faults_;
    std::vector<const asyntaxinfo*> spoilt_;
    byte_values bytes_;
    const ldif_line* last_ = nullptr;  // the line that was added last, and its attribute
    Attribute* attribute_ = nullptr;
    std::size_t attributes_ = 0;
    const char* unknown_ = "";  // the last name that the schema doesn't know
};

bool value_check::run()
{
    for (ldif_line& line : text_.lines()) {
        if (!look_up(line)) {
            continue;
        }
        if (line.spoilt) {
            spoilt_.push_back(line.info);
        } else if (!add(line)) {
            return false;
        }
    }
    return true;
}

void value_check::spoil(const ldif_line& line, kind what, const std::string& reason)
{
    spoilt_.push_back(line.info);
    faults_.add(what, line.line, line.type, reason);
}

// Finds the schema's record of a type. False, with a fault, for one that can't be used.
bool value_check::look_up(ldif_line& line)
{
    if (last_ != nullptr && std::strcmp(line.type, last_->type) == 0) {
        line.info = last_->info;
        return true;
    }
    if (std::strcmp(line.type, unknown_) == 0 && *unknown_ != '\0') {
        return false;  // has been told
    }
    if (!is_attr_name_valid(line.type, static_cast<int>(std::strlen(line.type)))) {
        faults_.add(kind::bad_type, line.line, line.type,
                    "no attribute name: a letter and then letters, digits, hyphens and options, or an OID");
        return false;
    }
    line.info = ldcf_api_attr_get_info(line.type, nullptr);
    if (!is_option_good(line)) {
        spoilt_.push_back(line.info);
        return false;
    }
    if (line.info == nullptr) {
        unknown_ = line.type;
        faults_.add(kind::undefined_attribute, line.line, line.type, "the schema has no such attribute");
        return false;
    }
    return true;
}

bool value_check::is_option_good(const ldif_line& line)
{
    const char* const option = std::strrchr(line.type, ';');
    if (option == nullptr) {
        return true;
    }
    if (::strcasecmp(option, binary_option) != 0) {
        if (is_valid_language_tag(option + 1) == 0) {
            faults_.add(kind::bad_option, line.line, line.type,
                        "the option \"" + std::string(option) + "\" is neither a language tag nor \";binary\"");
        }
        return is_valid_language_tag(option + 1) != 0;
    }
    const std::string base(line.type, static_cast<std::size_t>(option - line.type));
    if (line.info == nullptr && ldcf_api_attr_get_info(base.c_str(), nullptr) != nullptr) {
        faults_.add(kind::bad_option, line.line, line.type, "\";binary\" goes only with attributes that hold bytes");
        return false;
    }
    return true;
}

// Adds the value of a line. False when the entry is too large to go on.
bool value_check::add(ldif_line& line)
{
    const bool is_bytes = line.info->syntax == SC_BIN;
    if (!is_bytes && std::memchr(line.value, '\0', line.length) != nullptr) {
        spoil(line, kind::nul_byte, "the value is text, and holds a byte 0");
        return true;
    }
    if (last_ == nullptr || std::strcmp(line.type, last_->type) != 0) {
        attribute_ = attr_find(&entry_, line.type, 0, line.info);
    }
    const std::int64_t before = attribute_ == nullptr ? 0 : attribute_->a_numvals;
    const int result = merge(entry_, line, !is_bytes);
    if (attribute_ == nullptr) {
        attribute_ = attr_find(&entry_, line.type, 0, line.info);
        if (attribute_ != nullptr && ++attributes_ > attribute_limit) {
            faults_.add(kind::too_large, text_.line(), "",
                        "more than " + std::to_string(attribute_limit) + " attributes; the rest isn't checked");
            return false;
        }
    }
    last_ = &line;
    if (result != LDAP_SUCCESS) {
        const bool is_dn = (line.info->syntax & SC_DN) != 0;
        spoil(line, is_dn ? kind::bad_dn_value : kind::bad_value,
              quoted(value_of(line)) +
                  (is_dn ? ": " + refusal_of_dn(line.value) : std::string(" ") + words_of_syntax(line.info->syntax)));
    } else if (is_bytes ? !bytes_[attribute_].insert(value_of(line)).second : attribute_->a_numvals == before) {
        tell_duplicate(line);
    }
    return true;
}

void value_check::tell_duplicate(const ldif_line& line)
{
    std::string reason = quoted(value_of(line)) + " is there already";
    if (faults_.kept().size() < ldif_fault_list::most_kept) {
        berval value = {line.length, line.value};
        for (const ldif_line& earlier : text_.lines()) {
            berval other = {earlier.length, earlier.value};
            if (earlier.info == line.info && !earlier.spoilt && earlier.line < line.line &&
                value_cmp(&other, &value, line.info->syntax, 3) == 0) {
                reason += ", in line " + std::to_string(earlier.line);
                break;
            }
        }
    }
    faults_.add(kind::duplicate_value, line.line, line.type, reason);
}

// Turns the findings of the library's check into faults.
class schema_check final : public ldcf_entry_sink {
public:
    schema_check(Entry& entry, ldif_text& text, const value_check& values, ldif_fault_list& faults)
        : entry_(entry), text_(text), values_(values), faults_(faults)
    {
    }

    void run(const check_options& options);
    void report(const ldcf_entry_finding& finding) override;

private:
    std::size_t line_of_attribute(const char* name, std::size_t skip = 0) const;
    std::size_t line_of_class(const char* name) const;
    std::string class_that_requires(const char* name) const;
    void keep_one_value(const char* name);

    Entry& entry_;
    ldif_text& text_;
    const value_check& values_;
    ldif_fault_list& faults_;
    bool told_ = false;
    bool again_ = false;
};

void schema_check::run(const check_options& options)
{
    int result = LDAP_SUCCESS;
    do {
        again_ = false;
        result =
            not_without_memory(ldcf_check_entry(*ldcf_schema_g, &entry_, options.mode, options.policy, nullptr, *this));
    } while (again_);
    if (result != LDAP_SUCCESS && !told_) {
        faults_.add(kind::refused, text_.line(), "", result_words(result));
    }
}

// The line of the attribute's value with this number, from 0; that of the DN for a value that comes from there.
std::size_t schema_check::line_of_attribute(const char* name, std::size_t skip) const
{
    const asyntaxinfo* const info = ldcf_api_attr_get_info(name, nullptr);
    for (const ldif_line& line : text_.lines()) {
        if (line.info == info && info != nullptr && skip-- == 0) {
            return line.line;
        }
    }
    return text_.dn() == nullptr ? text_.line() : text_.dn()->line;
}

// The line of an object class; that of the first class for one that isn't there.
std::size_t schema_check::line_of_class(const char* name) const
{
    const asyntaxinfo* const info = ldcf_api_attr_get_info("objectClass", nullptr);
    for (const ldif_line& line : text_.lines()) {
        if (line.info == info && ::strcasecmp(line.value, name) == 0) {
            return line.line;
        }
    }
    return line_of_attribute("objectClass");
}

// The first class of the entry that requires an attribute; empty when none does by itself.
std::string schema_check::class_that_requires(const char* name) const
{
    const auto& classes = ldcf_schema_g->object_classes;
    for (berval** value = entry_.e_objectclass_attr->a_vals; value != nullptr && *value != nullptr; ++value) {
        const auto found = classes.find(csgl_string((*value)->bv_val));
        if (found == classes.end()) {
            continue;
        }
        for (const ldcf_attrtype& type : ldcf_api_get_must_set_from_objclass(found->second)) {
            if (::strcasecmp(type.name().c_str(), name) == 0) {
                return (*value)->bv_val;
            }
        }
    }
    return "";
}

// Takes all values but the first off an attribute, so that the check comes to the next fault.
void schema_check::keep_one_value(const char* name)
{
    Attribute* const attribute = attr_find(&entry_, name, 0, nullptr);
    if (attribute == nullptr || attribute->a_numvals < 2) {
        return;
    }
    attr_free_normvals(attribute);
    attr_free_decodedvals(attribute);
    for (berval** value = attribute->a_vals + 1; *value != nullptr; ++value) {
        ber_bvfree(*value);
        *value = nullptr;
    }
    attribute->a_numvals = 1;
    again_ = true;
}

void schema_check::report(const ldcf_entry_finding& finding)
{
    using found = ldcf_entry_finding_kind;
    const std::string name = finding.name == nullptr ? "" : finding.name;
    const std::string count = std::to_string(finding.count);
    const auto tell = [this](kind what, std::size_t line, const std::string& subject, const std::string& reason) {
        faults_.add(what, line, subject, reason);
        told_ = true;
    };
    const std::size_t begin = text_.line();
    switch (finding.kind) {
    case found::no_objectclass: return tell(kind::no_objectclass, begin, "", "the entry has no object class");
    case found::policy_undefined:
        return tell(kind::refused, begin, name, "the schema lacks this attribute of the password policy");
    case found::entry_dn_invalid: return tell(kind::bad_dn, line_of_attribute(""), "dn", "the DN is refused");
    case found::value_dn_invalid:
        return tell(kind::bad_dn_value, line_of_attribute(name.c_str(), static_cast<std::size_t>(finding.count)), name,
                    "a value is refused as a DN");
    case found::not_binary:
        return tell(kind::bad_option, line_of_attribute(name.c_str()), name,
                    "\";binary\" goes only with attributes that hold bytes");
    case found::attribute_undefined:
    case found::attribute_unknown:
        return tell(kind::undefined_attribute, line_of_attribute(name.c_str()), name,
                    "the schema has no such attribute");
    case found::single_value_exceeded:
    case found::boolean_exceeded:
        tell(kind::single_valued, line_of_attribute(name.c_str(), 1), name, "takes one value, and has " + count);
        return keep_one_value(name.c_str());
    case found::class_undefined:
    case found::class_unknown:
        return tell(kind::undefined_class, line_of_class(name.c_str()), name, "the schema has no such object class");
    case found::structural_class_missing:
        return tell(kind::no_structural, line_of_class(""), "objectClass", "none of the object classes is structural");
    case found::structural_class_count:
        if (finding.count != 0) {
            tell(kind::several_structural, line_of_class(""), "objectClass",
                 count + " structural object classes, none of them a superior of another");
        }
        return;
    case found::superclass_missing:
        return tell(kind::missing_superior, line_of_class(""), name,
                    "a superior of the entry's object classes that isn't among them");
    case found::attribute_missing:
        if (!values_.has_spoilt(ldcf_api_attr_get_info(name.c_str(), nullptr))) {
            const std::string by = class_that_requires(name.c_str());
            tell(kind::missing_attribute, begin, name, by.empty() ? "required, and missing" : "required by " + by);
        }
        told_ = true;
        return;
    case found::attribute_not_allowed:
        return tell(kind::not_allowed, line_of_attribute(name.c_str()), name, "no object class of the entry allows it");
    case found::alias_target_missing:
        return tell(kind::alias, begin, "aliasedObjectName", "the alias doesn't name its target");
    case found::alias_target_twice:
        return tell(kind::alias, begin, "aliasedObjectName", "the alias names its target by aliasedEntryName, too");
    case found::alias_target_exceeded:
        return tell(kind::alias, begin, "aliasedObjectName", "the alias has " + count + " targets");
    case found::referral_target_missing:
        return tell(kind::referral, begin, "ref", "the referral doesn't say where it leads");
    case found::top_added:
    case found::superclass_added:
    case found::mode_invalid: return;
    }
}

}  // namespace

entry_pointer new_entry(const ldif_text& text, ldif_fault_list& faults)
{
    Entry* made = nullptr;
    not_without_memory(CreateEntry(&made));
    entry_pointer entry(made);
    const ldif_line* const dn = text.dn();
    if (dn == nullptr || dn->spoilt) {
        return entry;
    }
    if (std::memchr(dn->value, '\0', dn->length) != nullptr) {
        faults.add(kind::nul_byte, dn->line, "dn", "the DN holds a byte 0");
        return entry;
    }
    if (value_of(*dn).find_first_not_of(' ') == std::string_view::npos) {
        faults.add(kind::bad_dn, dn->line, "dn", "the empty DN, which is no entry's");
        return entry;
    }
    entry->e_dn = strdup(dn->value);
    ldap_escDN* normal = entry->e_dn == nullptr ? nullptr : dn_normalize_esc(entry->e_dn);
    if (normal == nullptr) {
        throw std::bad_alloc();
    }
    if (not_without_memory(normal->result) == LDAP_SUCCESS) {
        entry->e_norm_dn = std::exchange(normal->upper, nullptr);
    }
    free_ldap_escDN(&normal);
    if (entry->e_norm_dn == nullptr) {
        faults.add(kind::bad_dn, dn->line, "dn", refusal_of_dn(dn->value));
    }
    return entry;
}

bool add_values(Entry& entry, ldif_text& text, bool complete, ldif_fault_list& faults)
{
    const bool may_be_too_many = text.lines().size() > attribute_limit;
    std::unordered_set<std::string_view> types;
    byte_values bytes;
    std::vector<const ldif_line*> refused;
    const auto tell = [&faults](const ldif_line& line, int result) {
        if (result != LDAP_SUCCESS) {
            faults.add(kind::bad_option, line.line, line.type, result_words(result));
        }
    };
    for (ldif_line& line : text.lines()) {
        if (may_be_too_many && types.insert(line.type).second && types.size() > attribute_limit) {
            faults.add(kind::too_large, text.line(), "",
                       "more than " + std::to_string(attribute_limit) + " attributes");
            return false;
        }
        if (!complete) {
            tell(line, merge(entry, line, false));
            continue;
        }
        line.info = ldcf_api_attr_get_info(line.type, nullptr);
        if (line.info != nullptr && line.info->syntax == SC_BIN) {
            tell(line, merge_bytes(entry, line, bytes));
        } else if (merge(entry, line, true) != LDAP_SUCCESS) {
            refused.push_back(&line);
        }
    }
    if (complete) {
        not_without_memory(expand_rdn_esc(&entry));
    }
    // They are taken as they are. Behind the others, for each costs the attribute its value tree.
    for (const ldif_line* line : refused) {
        tell(*line, merge_bytes(entry, *line, bytes));
    }
    return faults.empty();
}

entry_pointer make_entry(ldif_text& text, bool complete, ldif_fault_list& faults)
{
    entry_pointer entry = new_entry(text, faults);
    return entry->e_norm_dn != nullptr && add_values(*entry, text, complete, faults) ? std::move(entry) : nullptr;
}

void check_entry(ldif_text& text, const check_options& options, ldif_fault_list& faults)
{
    const entry_pointer entry = new_entry(text, faults);
    value_check values(*entry, text, faults);
    // Without its DN the naming attributes would be missed, too.
    if (!values.run() || entry->e_norm_dn == nullptr) {
        return;
    }
    const int result = not_without_memory(expand_rdn_esc(entry.get()));
    if (result != LDAP_SUCCESS) {
        faults.add(kind::bad_value, text.dn()->line, "dn", "a naming attribute is refused: " + result_words(result));
    }
    schema_check(*entry, text, values, faults).run(options);
}

}  // namespace dirbase_tool
