// A filter from its text: see filter_text.h.
#include "tools/dirbase/filter_text.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <new>
#include <optional>

#include "libraries/libber/ber_element.h"
#include "libraries/libber/ldap_error.h"
#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/connection/filter_ber.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/syntax_value.h"
#include "servers/vrnd/str2filter.h"
#include "tools/dirbase/data_commands.h"
#include "tools/dirbase/ldif_faults.h"

namespace dirbase_tool {

namespace {

constexpr std::uint64_t no_choice = 0;
constexpr const char* piece_names[] = {"initial", "any", "final"};  // by their tags, from LDAP_SUBSTRING_INITIAL on

struct choice_words {
    std::uint64_t choice;
    const char* name;
    const char* sign;  // between type and value
};

constexpr choice_words choices[] = {
    {LDAP_FILTER_AND, "and", ""},
    {LDAP_FILTER_OR, "or", ""},
    {LDAP_FILTER_NOT, "not", ""},
    {LDAP_FILTER_EQUALITY, "equality", " = "},
    {LDAP_FILTER_SUBSTRINGS, "substrings", ": "},
    {LDAP_FILTER_GE, "greater or equal", " >= "},
    {LDAP_FILTER_LE, "less or equal", " <= "},
    {LDAP_FILTER_PRESENT, "presence", ""},
    {LDAP_FILTER_APPROX, "approximate", " ~= "},
    {LDAP_FILTER_EXTENDED, "extensible match", " := "},
    {no_choice, "unknown", " "},
};

const choice_words& words_of(std::uint64_t choice)
{
    const choice_words* at = choices;
    while (at->choice != choice && at->choice != no_choice) {
        ++at;
    }
    return *at;
}

std::string not_null(const char* text)
{
    return text == nullptr ? "" : text;
}

std::string bytes_of(const berval& value)
{
    return value.bv_val == nullptr ? "" : std::string(value.bv_val, value.bv_len);
}

// ---- the grammar ----------------------------------------------------------------------------------------------------

// What is wrong with a text, and where: the library only tells that something is.
class grammar {
public:
    struct fault {
        std::size_t offset;
        std::string words;
    };

    explicit grammar(const std::string& text) : text_(text) {}

    std::optional<fault> find_fault() const { return find_in_filter(0, text_.size(), 1); }

private:
    std::optional<fault> find_in_filter(std::size_t begin, std::size_t end, unsigned depth) const;
    std::optional<fault> find_in_list(std::size_t begin, std::size_t end, unsigned depth) const;
    std::optional<fault> find_in_item(std::size_t begin, std::size_t end) const;

    const std::string& text_;
};

std::optional<grammar::fault> grammar::find_in_filter(std::size_t begin, std::size_t end, unsigned depth) const
{
    if (depth > FILTER_MAX_DEPTH) {
        return fault{begin, "nested deeper than " + std::to_string(FILTER_MAX_DEPTH) + " levels"};
    }
    if (begin == end) {
        return fault{begin, "nothing, where a filter is expected"};
    }
    if (text_[begin] != '(') {
        return find_in_item(begin, end);
    }
    const char* const closing = find_matching_paren(text_.c_str() + begin);
    if (closing == nullptr) {
        return fault{begin, "the parenthesis isn't closed"};
    }
    const auto close = static_cast<std::size_t>(closing - text_.c_str());
    if (close + 1 != end) {
        return fault{close + 1, "text behind the closing parenthesis of the filter"};
    }
    const char first = text_[begin + 1];
    return first == '&' || first == '|' || first == '!' ? find_in_list(begin + 1, close, depth)
                                                        : find_in_item(begin + 1, close);
}

// begin  where the operator stands
std::optional<grammar::fault> grammar::find_in_list(std::size_t begin, std::size_t end, unsigned depth) const
{
    std::size_t count = 0;
    for (std::size_t at = begin + 1;; ++count) {
        while (at < end && std::isspace(static_cast<unsigned char>(text_[at])) != 0) {
            ++at;
        }
        if (at == end) {
            break;
        }
        if (text_[at] != '(') {
            return fault{at, "a \"(\" is expected here"};
        }
        const char* const closing = find_matching_paren(text_.c_str() + at);
        if (closing == nullptr) {
            return fault{at, "the parenthesis isn't closed"};
        }
        const auto behind = static_cast<std::size_t>(closing - text_.c_str()) + 1;
        if (std::optional<fault> found = find_in_filter(at, behind, depth + 1); found) {
            return found;
        }
        at = behind;
    }
    if (text_[begin] == '!' && count != 1) {
        return fault{begin, "a NOT takes one element, and has " + std::to_string(count)};
    }
    return {};
}

std::optional<grammar::fault> grammar::find_in_item(std::size_t begin, std::size_t end) const
{
    const std::string_view item = std::string_view(text_).substr(begin, end - begin);
    const std::string_view type = item.substr(0, item.find('='));
    if (type.size() == item.size()) {
        return fault{begin, item.empty() ? "nothing between the parentheses" : "no \"=\" in " + quoted(item)};
    }
    if (const std::size_t parenthesis = type.find_first_of("()"); parenthesis != std::string_view::npos) {
        return fault{begin + parenthesis, "a parenthesis, where the name of an attribute is expected"};
    }
    if (type.find_first_not_of(" <>~") == std::string_view::npos) {
        return fault{begin, "no attribute in front of \"=\""};
    }
    return {};
}

// ---- the encoding of a search request -------------------------------------------------------------------------------

// A value, or a construction around values that are encoded already. An element that writes has no room for as many
// open constructions as a filter and its assertions need.
std::string encoded(std::uint64_t tag, std::string_view content)
{
    struct free_ber {
        void operator()(BerElement* ber) const noexcept { ber_free(ber, 1); }
    };
    const std::unique_ptr<BerElement, free_ber> ber(ber_alloc());
    if (ber == nullptr ||
        ber_printf(ber.get(), "to", static_cast<ber_tag_t>(tag), content.data(), ber_len_t{content.size()}) != 0) {
        throw std::bad_alloc();
    }
    return {ber->ber_buf, static_cast<std::size_t>(ber->ber_ptr - ber->ber_buf)};
}

// The bytes of a piece of a substring filter, which the parser leaves as it is written.
std::string unescaped(const char* piece)
{
    const heap_text text(unescape_value(piece));
    if (text == nullptr) {
        throw std::bad_alloc();
    }
    std::size_t length = 0;
    const auto is_digit = [](char c) { return std::isxdigit(static_cast<unsigned char>(c)) != 0; };
    while (*piece != '\0') {
        const bool is_escape = *piece == '\\' && is_digit(piece[1]);
        piece += !is_escape ? 1 : is_digit(piece[2]) ? 3 : 2;
        ++length;
    }
    return {text.get(), length};
}

std::string encoded_substrings(const Filter& raw)
{
    std::string pieces;
    const auto add = [&pieces](unsigned tag, const char* piece) { pieces += encoded(tag, unescaped(piece)); };
    // The parser gives an empty initial piece for a text that begins with "*".
    if (raw.f_sub.f_sub_initial != nullptr && *raw.f_sub.f_sub_initial != '\0') {
        add(LDAP_SUBSTRING_INITIAL, raw.f_sub.f_sub_initial);
    }
    for (char** any = raw.f_sub.f_sub_any; any != nullptr && *any != nullptr; ++any) {
        add(LDAP_SUBSTRING_ANY, *any);
    }
    if (raw.f_sub.f_sub_final != nullptr) {
        add(LDAP_SUBSTRING_FINAL, raw.f_sub.f_sub_final);
    }
    return encoded(raw.f_choice,
                   encoded(LBER_OCTETSTRING, not_null(raw.f_sub.f_sub_type)) + encoded(LBER_SEQUENCE, pieces));
}

// TYPE:dn:RULE: in front of "=" (RFC 4511 section 4.5.1.7.7); type, "dn" and rule may be missing.
std::string encoded_match(const std::string& description, const std::string& value)
{
    std::size_t at = description.find(':');
    const std::string type = description.substr(0, at);
    std::string rule;
    bool with_dn = false;
    while (at + 1 < description.size()) {
        const std::size_t end = std::min(description.find(':', at + 1), description.size());
        const std::string part = description.substr(at + 1, end - at - 1);
        const bool is_flag = part == "dn" && !with_dn;
        with_dn = with_dn || is_flag;
        rule = is_flag ? rule : part;
        at = end;
    }
    return encoded(LDAP_FILTER_EXTENDED, (rule.empty() ? "" : encoded(0x81, rule)) +
                                             (type.empty() ? "" : encoded(0x82, type)) + encoded(0x83, value) +
                                             (with_dn ? encoded(0x84, "\xFF") : ""));
}

const char* type_of(const Filter& filter)
{
    const char* const type = filter.f_choice == LDAP_FILTER_PRESENT      ? filter.f_type
                             : filter.f_choice == LDAP_FILTER_SUBSTRINGS ? filter.f_sub.f_sub_type
                                                                         : filter.f_ava.ava_type;
    return type == nullptr ? "" : type;
}

// ---- what a server makes of it --------------------------------------------------------------------------------------

// What get_filter gives for an encoding.
struct reading {
    int result = 0;
    filter_pointer filter;
    std::string text;
    std::string error;

    explicit reading(const std::string& encoding)
    {
        Connection client;
        client.c_ssl = 1;
        std::string bytes = encoding;
        const berval value = {bytes.size(), bytes.data()};
        BerElement ber = {};
        ber_init2(&value, 0, &ber);
        Filter* made = nullptr;
        char* made_text = nullptr;
        char* made_error = nullptr;
        result = get_filter(&client, &ber, &made, &made_text, &made_error);
        filter.reset(made);
        const heap_text text_owner(made_text);
        const heap_text error_owner(made_error);
        if (result == LDAP_NO_MEMORY) {
            throw std::bad_alloc();
        }
        text = not_null(made_text);
        error = not_null(made_error);
    }

    filter_verdict verdict() const
    {
        return result != LDAP_SUCCESS ? filter_verdict::refused
               : filter != nullptr    ? filter_verdict::defined
                                      : filter_verdict::undefined;
    }
    std::string refusal() const
    {
        return result_words(result) + ": " + (error.empty() ? ldap_err2string(result) : error);
    }
};

std::string reason_of_undefined(const filter_element& element)
{
    if (element.choice == LDAP_FILTER_EXTENDED) {
        return "extensible match isn't supported";
    }
    std::string type = element.type;
    type.resize(std::strlen(attr_normalize(type.data())));
    asyntaxinfo* info = nullptr;
    if (attr_syntax_for_filter_return_asi(type.c_str(), &info) != 0) {
        const unsigned room = info->attr == nullptr ? 0 : info->attr->length;
        return "the value is longer than the attribute's column, " + std::to_string(room) + " bytes";
    }
    if (!is_attr_name_valid(type.c_str(), static_cast<int>(type.size()))) {
        return quoted(std::string_view(type)) + " is no name of an attribute";
    }
    return "the schema has no attribute " + quoted(std::string_view(type));
}

// Puts what a filter without elements looks for into words.
void describe(filter_element& element, const Filter& filter)
{
    element.type = type_of(filter);
    element.pieces.clear();
    if (filter_has_ava(filter.f_choice)) {
        element.value = bytes_of(filter.f_ava.ava_value);
    } else if (filter.f_choice == LDAP_FILTER_SUBSTRINGS) {
        const filter_substrings& parts = filter.f_sub;
        if (parts.f_sub_initial != nullptr && *parts.f_sub_initial != '\0') {
            element.pieces.emplace_back(piece_names[0], parts.f_sub_initial);
        }
        for (char** any = parts.f_sub_any; any != nullptr && *any != nullptr; ++any) {
            element.pieces.emplace_back(piece_names[1], *any);
        }
        if (parts.f_sub_final != nullptr) {
            element.pieces.emplace_back(piece_names[2], parts.f_sub_final);
        }
    }
}

// What stands behind "=" in a filter without elements.
std::string value_as_written(const filter_element& element)
{
    if (element.choice == LDAP_FILTER_PRESENT) {
        return "*";
    }
    std::string text = element.value;
    for (const auto& [name, piece] : element.pieces) {
        text += (name == piece_names[0] ? "" : "*") + piece;
    }
    return text + (!element.pieces.empty() && element.pieces.back().first != piece_names[2] ? "*" : "");
}

// What is known about an element that is refused, besides the result.
std::string cause_of_refusal(const filter_element& element)
{
    bool has_zero = element.value.find('\0') != std::string::npos;
    for (const auto& [name, piece] : element.pieces) {
        if (piece.empty()) {
            return ", for nothing stands between two \"*\"";
        }
        has_zero = has_zero || unescaped(piece.c_str()).find('\0') != std::string::npos;
    }
    return has_zero ? ", for the value holds a byte 0" : "";
}

// A server takes integers, booleans and times that are none, and compares them as well as it can.
std::string remark_on(const filter_element& element)
{
    if (element.choice != LDAP_FILTER_EQUALITY && element.choice != LDAP_FILTER_GE &&
        element.choice != LDAP_FILTER_LE) {
        return "";
    }
    asyntaxinfo* info = nullptr;
    const std::uint32_t syntax = attr_syntax_for_filter_return_asi(element.type.c_str(), &info);
    const bool is_compared =
        (syntax & (SC_INT | SC_GT | SC_UTCT)) != 0 || (syntax == SC_BOOL && element.choice == LDAP_FILTER_EQUALITY);
    if (!is_compared || check_syntax(syntax, element.value.c_str()) == 0) {
        return "";
    }
    const char* const effect = syntax == SC_INT    ? "it counts as the number that it begins with, or 0"
                               : syntax == SC_BOOL ? "no proper value equals it"
                                                   : "every proper time counts as the greater one";
    return std::string("the value ") + fault_of_syntax(syntax) + "; " + effect;
}

// Describes a filter without elements and gives its encoding.
std::string take_item(const Filter& raw, filter_element& element)
{
    describe(element, raw);
    std::string encoding;
    if (element.type.find(':') != std::string::npos) {
        const std::string value = value_as_written(element);
        element.choice = LDAP_FILTER_EXTENDED;
        element.value = value;
        element.pieces.clear();
        encoding = encoded_match(element.type, value);
        element.type.resize(element.type.size() - (element.type.ends_with(':') ? 1 : 0));
    } else if (raw.f_choice == LDAP_FILTER_SUBSTRINGS) {
        encoding = encoded_substrings(raw);
    } else if (raw.f_choice == LDAP_FILTER_PRESENT) {
        encoding = encoded(raw.f_choice, element.type);
    } else {
        encoding =
            encoded(raw.f_choice, encoded(LBER_OCTETSTRING, element.type) + encoded(LBER_OCTETSTRING, element.value));
    }
    const reading read(encoding);
    element.verdict = read.verdict();
    element.result = read.result;
    if (read.result != LDAP_SUCCESS) {
        element.reason = read.refusal() + cause_of_refusal(element);
    } else if (read.filter != nullptr) {
        describe(element, *read.filter);
        element.remark = remark_on(element);
    } else {
        element.reason = reason_of_undefined(element);
    }
    return encoding;
}

// The same for any filter, as deep as the parser allows.
std::string take(const Filter& raw, filter_element& element)
{
    element.choice = raw.f_choice;
    if (!filter_has_list(raw.f_choice)) {
        return take_item(raw, element);
    }
    std::string content;
    for (const Filter* child = raw.f_list; child != nullptr; child = child->f_next) {
        content += take(*child, element.elements.emplace_back());
    }
    if (element.elements.empty()) {
        element.verdict = filter_verdict::undefined;
        element.reason = "it has no elements";
    }
    return encoded(raw.f_choice, content);
}

// Control bytes, and when the text isn't UTF-8 all bytes beyond ASCII, in the form that a filter has for them.
std::string printable(const std::string& text)
{
    constexpr char digits[] = "0123456789abcdef";
    const bool keep = is_utf8(text);
    std::string result;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte == 0x7F || (byte > 0x7F && !keep)) {
            result += {'\\', digits[byte >> 4], digits[byte & 15]};
        } else {
            result += c;
        }
    }
    return result;
}

void collect_remarks(const filter_element& element, bool only_undefined, std::vector<std::string>& remarks)
{
    if (!element.reason.empty()) {
        remarks.push_back(element.label() +
                          (element.verdict == filter_verdict::refused ? " is refused: " : " is undefined: ") +
                          element.reason);
    }
    if (!element.remark.empty() && !only_undefined) {
        remarks.push_back(element.label() + ": " + element.remark);
    }
    for (const filter_element& child : element.elements) {
        collect_remarks(child, only_undefined, remarks);
    }
}

}  // namespace

std::string filter_element::label() const
{
    const choice_words& words = words_of(choice);
    std::string text = words.name;
    if (filter_has_list(choice)) {
        return text;
    }
    text += " " + shortened(type) + words.sign;
    if (choice != LDAP_FILTER_SUBSTRINGS) {
        return text + shortened(value);
    }
    for (const auto& [name, piece] : pieces) {
        text += (&piece == &pieces.front().second ? "" : ", ") + std::string(name) + " " + shortened(piece);
    }
    return text;
}

json filter_element::as_json() const
{
    json member = {{"kind", words_of(choice).name}};
    if (filter_has_list(choice)) {
        member["elements"] = json::array();
        for (const filter_element& element : elements) {
            member["elements"].push_back(element.as_json());
        }
    } else {
        member["attribute"] = json_of_value(type);
        if (choice == LDAP_FILTER_SUBSTRINGS) {
            member["pieces"] = json::array();
            for (const auto& [name, piece] : pieces) {
                json& last = member["pieces"].emplace_back(json::object());
                last[name] = json_of_value(piece);
            }
        } else if (choice != LDAP_FILTER_PRESENT) {
            member["value"] = json_of_value(value);
        }
    }
    if (!reason.empty()) {
        member[verdict == filter_verdict::refused ? "refused" : "undefined"] = reason;
    }
    if (!remark.empty()) {
        member["remark"] = remark;
    }
    return member;
}

parsed_filter::parsed_filter(const std::string& text)
{
    constexpr char blanks[] = " \t\r\n";
    const std::size_t begin = text.find_first_not_of(blanks);
    const bool is_bare = begin == std::string::npos || text[begin] != '(';  // blanks may belong to the value
    const std::string trimmed = is_bare ? text : text.substr(begin, text.find_last_not_of(blanks) + 1 - begin);
    if (const std::optional<grammar::fault> found = grammar(trimmed).find_fault(); found) {
        fault_ = found->words;
        offset_ = found->offset + (is_bare ? 0 : begin);
        return;
    }
    const filter_pointer raw(str2filter(trimmed.c_str(), 0));
    if (raw == nullptr) {
        throw std::bad_alloc();
    }
    reading whole(take(*raw, root_));
    verdict_ = whole.verdict();
    filter_ = std::move(whole.filter);
    canonical_ = printable(whole.text);
    fault_ = whole.result == LDAP_SUCCESS ? "" : whole.refusal();
}

std::vector<std::string> parsed_filter::remarks(bool only_undefined) const
{
    std::vector<std::string> remarks;
    collect_remarks(root_, only_undefined, remarks);
    return remarks;
}

}  // namespace dirbase_tool
