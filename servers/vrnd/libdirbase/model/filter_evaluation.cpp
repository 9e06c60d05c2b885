// Evaluation of filters: see filter_evaluation.h.
//
// test_filter descends with a small frame for each level: the buffers for values are in the frames of the functions at
// the leaves. Values are normalised one at a time in such a buffer, so that a test doesn't allocate for values of
// common length.
#include "servers/vrnd/libdirbase/model/filter_evaluation.h"

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string_view>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/environment.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_ids.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/phonetic.h"
#include "servers/vrnd/libdirbase/model/substring_match.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

std::once_flag first_time;
std::atomic<bool> check_oc_alias = false;

// Syntaxes whose values aren't texts.
constexpr std::uint32_t not_a_text = SC_BIN | SC_BOOL | SC_INT | SC_GT | SC_UTCT;

// Bytes of a pattern.
constexpr std::size_t pattern_space = 1022;

std::string_view text_of(const berval& value)
{
    return value.bv_val == nullptr ? std::string_view("")
                                   : std::string_view(value.bv_val, strnlen(value.bv_val, value.bv_len));
}

std::string_view text_of(const char* piece)
{
    return piece == nullptr ? std::string_view() : std::string_view(piece);
}

// The versions of an attribute in an entry.
class version_walk {
public:
    version_walk(const Entry* entry, const char* type)
        : entry_(entry), type_(type), info_(ldcf_api_attr_get_info(type, nullptr))
    {
    }

    // Null for an attribute that the schema doesn't know; such a walk finds nothing.
    const asyntaxinfo* info() const { return info_; }
    std::uint32_t syntax() const { return info_ == nullptr ? SC_CIS : info_->syntax; }

    // Null when there is none, or no further one; and on failure, which `result` tells from that.
    const Attribute* first()
    {
        failed_ = attr_find_attr_or_lang_tag_version(entry_, type_, &started_, &tag_state_, &info_, &attr_) != 0;
        return failed_ ? nullptr : attr_;
    }
    const Attribute* next()
    {
        failed_ = attr_find_next_attr_match(entry_, type_, &started_, &tag_state_, info_, &attr_) != 0;
        return failed_ ? nullptr : attr_;
    }

    // Of a test that came to the end of the walk.
    int result() const { return failed_ ? static_cast<int>(LDAP_OPERATIONS_ERROR) : FILTER_FALSE; }

private:
    const Entry* entry_;
    const char* type_;
    asyntaxinfo* info_;
    Attribute* attr_ = nullptr;
    int started_ = 0;
    int tag_state_ = -1;
    bool failed_ = false;
};

// A value in normal form, on a copy; as it is where it has none.
class normal_value {
public:
    normal_value() = default;
    normal_value(const normal_value&) = delete;
    normal_value& operator=(const normal_value&) = delete;

    // Takes a value in place of the one before. The copy that it is made on is kept, where it is a block, for the next.
    // False when memory ran out.
    bool assign(const berval& value, std::uint32_t syntax)
    {
        if ((syntax & SC_CIS) == 0) {
            value_ = value;
            return true;
        }
        const std::size_t length = value.bv_val == nullptr ? 0 : value.bv_len;
        if (length >= room_) {
            block_.reset(static_cast<char*>(std::malloc(length + 1)));
            copy_ = block_ == nullptr ? buffer_ : block_.get();
            room_ = block_ == nullptr ? sizeof buffer_ : length + 1;
            if (block_ == nullptr) {
                return false;
            }
        }
        if (length != 0) {
            std::memcpy(copy_, value.bv_val, length);
        }
        copy_[length] = '\0';
        value_ = {length, copy_};
        value_normalize_berval(&value_, syntax, 1);
        grown_.reset(value_.bv_val == copy_ ? nullptr : value_.bv_val);
        return true;
    }

    const berval& value() const { return value_; }

private:
    char buffer_[512];
    char* copy_ = buffer_;
    std::size_t room_ = sizeof buffer_;  // of copy_
    heap_text block_;                    // what copy_ is for long values
    heap_text grown_;                    // the normal form of a DN that didn't fit into the copy
    berval value_ = {};
};

int no_memory(const char* function)
{
    debug_error("Error - %s: malloc() failed. Out of memory\n", function);
    return LDAP_NO_MEMORY;
}

// ---- equality and orderings -----------------------------------------------------------------------------------------

// Failures of value_cmp are above 0: a value that can't be compared, such as a bad time, counts as the greater one.
bool is_met_by(int order, std::uint64_t choice)
{
    return choice == LDAP_FILTER_EQUALITY ? order == 0 : choice == LDAP_FILTER_GE ? order >= 0 : order <= 0;
}

[[gnu::noinline]] int test_each_value(berval* const* values, const berval& wanted, std::uint32_t syntax,
                                      std::uint64_t choice)
{
    normal_value normal;
    for (; values != nullptr && *values != nullptr; ++values) {
        if (!normal.assign(**values, syntax)) {
            return no_memory("test_ava_filter");
        }
        const int order = value_cmp(&normal.value(), &wanted, syntax, 0);
        if (order == LDAP_NO_MEMORY && (syntax & (SC_GT | SC_UTCT)) != 0) {  // of texts it is an order like others
            return order;
        }
        if (is_met_by(order, choice)) {
            return FILTER_TRUE;
        }
    }
    return FILTER_FALSE;
}

bool is_password(berval* const* values, const berval& wanted)
{
    for (; values != nullptr && *values != nullptr; ++values) {
        if (verify_password(&wanted, *values, 1, g_DirKeyData) == 0) {
            return true;
        }
    }
    return false;
}

// The assertion is normalised once more, to which not every normal form lends itself: the digits of a bit string have
// lost their quotes, and some DNs their limits. Those are looked for as they are.
int find_in_tree(const Attribute& attr, const berval& wanted, std::uint32_t syntax)
{
    int found = value_find(&attr, &wanted, syntax, 1);
    if (found != 0 && found != 1 && (syntax & SC_CIS) != 0) {
        found = value_find(&attr, &wanted, syntax, 0);
        const bool is_normal = (syntax & SC_BIT_STRING) != 0 && wanted.bv_len != 0 &&
                               text_of(wanted).find_first_not_of("01") == std::string_view::npos;
        if (found == 1 && !is_normal) {
            return LDAP_OPERATIONS_ERROR;
        }
    }
    return found == 0 ? FILTER_TRUE : found == 1 ? FILTER_FALSE : static_cast<int>(LDAP_OPERATIONS_ERROR);
}

int test_version(const Attribute& attr, const asyntaxinfo& info, const berval& wanted, std::uint64_t choice)
{
    const auto syntax = static_cast<std::uint32_t>(attr.a_syntax);
    const bool equality = choice == LDAP_FILTER_EQUALITY;
    if (equality && attr.a_tree != nullptr) {
        return find_in_tree(attr, wanted, syntax);
    }
    const bool decoded = equality && (info.encryption & PWD_TWO_WAY) != 0 && attr.a_decoded != nullptr;
    return test_each_value(decoded ? attr.a_decoded : attr.a_vals, wanted, syntax, choice);
}

bool is_encrypted_one_way(const asyntaxinfo& info)
{
    return info.encryption != PWD_NONE && (info.encryption & PWD_TWO_WAY) == 0;
}

int test_versions(version_walk& walk, const Attribute* first, const berval& wanted, std::uint64_t choice)
{
    for (const Attribute* attr = first; attr != nullptr; attr = walk.next()) {
        if (choice == LDAP_FILTER_EQUALITY && is_encrypted_one_way(*walk.info())) {
            return is_password(attr->a_vals, wanted) ? FILTER_TRUE : FILTER_FALSE;
        }
        const int result = test_version(*attr, *walk.info(), wanted, choice);
        if (result != FILTER_FALSE) {
            return result;
        }
    }
    return walk.result();
}

// The first name of a class stands for all of them.
[[gnu::noinline]] int test_class(version_walk& walk, const Attribute* first, const objectclassinfo& objectclass)
{
    char* const name = objectclass.names[0];
    normal_value wanted;
    if (!wanted.assign({std::strlen(name), name}, static_cast<std::uint32_t>(first->a_syntax))) {
        return no_memory("test_ava_filter");
    }
    return test_versions(walk, first, wanted.value(), LDAP_FILTER_EQUALITY);
}

// ---- substrings -----------------------------------------------------------------------------------------------------

bool is_special(char c)
{
    switch (c) {
    case '$':
    case '*':
    case '+':
    case '.':
    case '[':
    case '\\':
    case ']':
    case '^': return true;
    default: return false;
    }
}

// Counts the pieces into the pattern space.
class pattern_size {
public:
    // False when a piece doesn't fit.
    bool add(std::string_view piece, std::size_t signs)
    {
        if (used_ + 2 * piece.size() + 2 > pattern_space) {
            return false;
        }
        used_ += piece.size() + static_cast<std::size_t>(std::count_if(piece.begin(), piece.end(), is_special)) + signs;
        return true;
    }

private:
    std::size_t used_ = 0;
};

bool fits_pattern_space(const filter_substrings& wanted)
{
    pattern_size size;
    bool fits = wanted.f_sub_initial == nullptr || size.add(wanted.f_sub_initial, std::strlen("^"));
    for (char* const* piece = wanted.f_sub_any; fits && piece != nullptr && *piece != nullptr; ++piece) {
        fits = size.add(*piece, std::strlen(".*"));
    }
    return fits && (wanted.f_sub_final == nullptr || size.add(wanted.f_sub_final, std::strlen(".*$")));
}

// Whether the first byte tells that a value doesn't begin with a piece, so that it needn't be normalised. In text that
// is only folded to upper case an ASCII character stays where it is.
bool begins_otherwise(const berval& value, std::string_view initial, std::uint32_t syntax)
{
    if (syntax != SC_CIS || initial.empty() || value.bv_val == nullptr || value.bv_len == 0) {
        return false;
    }
    const char first = value.bv_val[0];
    const char upper = first >= 'a' && first <= 'z' ? static_cast<char>(first - 'a' + 'A') : first;
    return static_cast<unsigned char>(first) < 0x80 && upper != initial[0];
}

[[gnu::noinline]] int find_substrings(const Attribute& attr, const filter_substrings& wanted)
{
    const std::string_view initial = text_of(wanted.f_sub_initial);
    const std::string_view final = text_of(wanted.f_sub_final);
    const auto syntax = static_cast<std::uint32_t>(attr.a_syntax);
    normal_value normal;
    for (berval* const* value = attr.a_vals; value != nullptr && *value != nullptr; ++value) {
        if (begins_otherwise(**value, initial, syntax)) {
            continue;
        }
        if (!normal.assign(**value, syntax)) {
            return no_memory("test_substring_filter");
        }
        if (substring_match(text_of(normal.value()), initial, wanted.f_sub_any, final)) {
            return FILTER_TRUE;
        }
    }
    return FILTER_FALSE;
}

// ---- the tree -------------------------------------------------------------------------------------------------------

int negated(int result)
{
    return result == FILTER_TRUE ? FILTER_FALSE : result == FILTER_FALSE ? FILTER_TRUE : result;
}

int test_node(const Entry* entry, const Filter* filter);

int test_nodes(const Entry* entry, const Filter* first, std::uint64_t choice)
{
    // What the list is as long as no child tells otherwise.
    const int neutral = choice == LDAP_FILTER_AND ? FILTER_TRUE : FILTER_FALSE;
    for (const Filter* child = first; child != nullptr; child = child->f_next) {
        const int result = test_node(entry, child);
        if (result != neutral) {
            return result;
        }
    }
    return first == nullptr ? FILTER_FALSE : neutral;
}

int test_node(const Entry* entry, const Filter* filter)
{
    if (filter == nullptr) {
        return LDAP_OPERATIONS_ERROR;
    }
    switch (filter->f_choice) {
    case LDAP_FILTER_AND:
    case LDAP_FILTER_OR: return test_nodes(entry, filter->f_list, filter->f_choice);
    case LDAP_FILTER_NOT: return negated(test_node(entry, filter->f_list));
    case LDAP_FILTER_EQUALITY:
    case LDAP_FILTER_GE:
    case LDAP_FILTER_LE: return test_ava_filter(entry, &filter->f_ava, filter->f_choice);
    case LDAP_FILTER_SUBSTRINGS: return test_substring_filter(entry, filter);
    case LDAP_FILTER_PRESENT: return test_presence_filter(entry, filter->f_type);
    case LDAP_FILTER_APPROX: return test_approx_filter(entry, &filter->f_ava);
    default:
        debug_error("    unknown filter type %d\n", static_cast<int>(filter->f_choice));
        return LDAP_OPERATIONS_ERROR;
    }
}

void read_environment()
{
    const heap_text value = environment_value("OC_ALIAS");
    check_oc_alias = value != nullptr && vrn_strcasecmp(value.get(), "YES") == 0;
}

}  // namespace

extern "C" {

int test_filter(const Entry* entry, const Filter* filter)
{
    std::call_once(first_time, read_environment);
    return entry == nullptr ? static_cast<int>(LDAP_OPERATIONS_ERROR) : test_node(entry, filter);
}

int test_filter_list(const Entry* entry, const Filter* first, std::uint64_t choice)
{
    if (entry == nullptr || (choice != LDAP_FILTER_AND && choice != LDAP_FILTER_OR)) {
        return LDAP_OPERATIONS_ERROR;
    }
    return test_nodes(entry, first, choice);
}

int test_presence_filter(const Entry* entry, const char* type)
{
    return version_walk(entry, type).first() == nullptr ? FILTER_FALSE : FILTER_TRUE;
}

int test_ava_filter(const Entry* entry, const ava* assertion, std::uint64_t choice)
{
    const bool equality = choice == LDAP_FILTER_EQUALITY;
    if (assertion == nullptr || !(equality || choice == LDAP_FILTER_GE || choice == LDAP_FILTER_LE)) {
        return LDAP_OPERATIONS_ERROR;
    }
    version_walk walk(entry, assertion->ava_type);
    if ((walk.syntax() & SC_BIN) != 0) {
        return LDAP_NOT_SUPPORTED;
    }
    if ((walk.syntax() & SC_BOOL) != 0 && !equality) {
        return LDAP_FILTER_ERROR;
    }
    const Attribute* const first = walk.first();
    if (first == nullptr) {
        return walk.result();
    }
    if (equality && walk.info()->attr_id == attr_id_objectclass && check_oc_alias) {
        const objectclassinfo* const objectclass = ldcf_api_objectclass_get_info(assertion->ava_value.bv_val);
        if (objectclass != nullptr) {
            return test_class(walk, first, *objectclass);
        }
    }
    return test_versions(walk, first, assertion->ava_value, choice);
}

int test_approx_filter(const Entry* entry, const ava* assertion)
{
    if (assertion == nullptr) {
        return LDAP_OPERATIONS_ERROR;
    }
    version_walk walk(entry, assertion->ava_type);
    if ((walk.syntax() & not_a_text) != 0) {
        return LDAP_FILTER_ERROR;
    }
    // Nothing in front of the first word is a letter, so the codes of whole texts are those from the first word on.
    const phonetic_code wanted = phonetic_code_of(text_of(assertion->ava_value));
    for (const Attribute* attr = walk.first(); attr != nullptr; attr = walk.next()) {
        for (berval* const* value = attr->a_vals; value != nullptr && *value != nullptr; ++value) {
            if (phonetic_code_of(text_of(**value)) == wanted) {
                return FILTER_TRUE;
            }
        }
    }
    return walk.result();
}

int test_substring_filter(const Entry* entry, const Filter* filter)
{
    if (filter == nullptr || filter->f_choice != LDAP_FILTER_SUBSTRINGS) {
        return LDAP_OPERATIONS_ERROR;
    }
    const filter_substrings& wanted = filter->f_sub;
    version_walk walk(entry, wanted.f_sub_type);
    if ((walk.syntax() & not_a_text) != 0) {
        return LDAP_FILTER_ERROR;
    }
    const Attribute* attr = walk.first();
    if (attr != nullptr && !fits_pattern_space(wanted)) {
        debug_error("not enough pattern space\n");
        return LDAP_OPERATIONS_ERROR;
    }
    for (; attr != nullptr; attr = walk.next()) {
        const int result = find_substrings(*attr, wanted);
        if (result != FILTER_FALSE) {
            return result;
        }
    }
    return walk.result();
}

void strcpy_special(char* target, const char* source)
{
    for (; *source != '\0'; ++source) {
        if (is_special(*source)) {
            *target++ = '\\';
        }
        *target++ = *source;
    }
    *target = '\0';
}

void InitRegex(void) {}

}  // extern "C"
