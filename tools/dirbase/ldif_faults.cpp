// What may be wrong with an entry of an LDIF file: see ldif_faults.h.
#include "tools/dirbase/ldif_faults.h"

#include <algorithm>

namespace dirbase_tool {

namespace {

constexpr std::size_t longest_quote = 80;
constexpr std::size_t longest_member = 16384;  // of the JSON of a fault

// In the order of the kinds.
constexpr ldif_fault_words words[] = {
    {"no-colon", "lines without \":\" behind the attribute"},
    {"bad-type", "malformed attribute names"},
    {"bad-base64", "values that aren't Base64"},
    {"bad-url", "URL values that can't be read"},
    {"nul-byte", "bytes 0 in the text, or in a value that is text"},
    {"fold-at-start", "continuation lines with nothing to continue"},
    {"bad-version", "versions of LDIF other than 1"},
    {"changetype", "changes other than the addition of an entry"},
    {"too-large", "entries beyond the limits"},
    {"no-dn", "entries without a DN"},
    {"second-dn", "entries with a second DN, mostly for want of an empty line"},
    {"bad-dn", "DNs that are refused"},
    {"bad-option", "options other than a language tag, and \";binary\" where it may not be"},
    {"bad-value", "values that their syntax refuses"},
    {"bad-dn-value", "values that are refused as DNs"},
    {"duplicate-value", "values that an attribute has already"},
    {"undefined-attribute", "attributes that the schema doesn't know"},
    {"single-valued", "several values of an attribute that takes one"},
    {"no-objectclass", "entries without an object class"},
    {"undefined-class", "object classes that the schema doesn't know"},
    {"no-structural", "entries without a structural object class"},
    {"several-structural", "entries with structural object classes that aren't of one line"},
    {"missing-superior", "object classes without their superior"},
    {"missing-attribute", "required attributes that are missing"},
    {"not-allowed", "attributes that no object class of the entry allows"},
    {"alias", "aliases that don't name one target"},
    {"referral", "referrals that lead nowhere"},
    {"refused", "entries that the schema check refuses for another reason"},
};
static_assert(std::size(words) == ldif_fault_kinds);

// The longest beginning of a text that has at most `length` bytes and doesn't end inside a character.
std::string_view beginning_of(std::string_view text, std::size_t length)
{
    std::size_t end = std::min(length, text.size());
    while (end < text.size() && end > length - 4 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) {
        --end;
    }
    return text.substr(0, end);
}

std::string cut(const std::string& text)
{
    return text.size() <= longest_member
               ? text
               : std::string(beginning_of(text, longest_member)) + "... (" + std::to_string(text.size()) + " bytes)";
}

}  // namespace

const ldif_fault_words& words_of(ldif_fault_kind kind)
{
    return words[static_cast<std::size_t>(kind)];
}

void ldif_fault_list::add(ldif_fault_kind kind, std::size_t line, std::string_view subject, std::string_view reason)
{
    ++counts_[static_cast<std::size_t>(kind)];
    if (kept_.size() < most_kept) {
        kept_.push_back({kind, line, std::string(subject), std::string(reason)});
    } else {
        ++left_out_;
    }
}

void ldif_fault_list::clear()
{
    kept_.clear();
    left_out_ = 0;
    counts_ = {};
}

std::string quoted(std::string_view value)
{
    const std::string_view shown = beginning_of(value, longest_quote);
    return "\"" + std::string(shown) + (shown.size() < value.size() ? "...\"" : "\"");
}

std::string words_for_left_out(const ldif_fault_list& faults)
{
    const bool is_one = faults.left_out() == 1;
    return "and " + std::to_string(faults.left_out()) + (is_one ? " more fault" : " more faults") + " in this entry";
}

std::string text_of(const ldif_fault& fault)
{
    return fault.subject.empty() ? fault.reason : fault.subject + ": " + fault.reason;
}

std::string line_of(const ldif_fault& fault, const std::string& source, const std::string& dn)
{
    std::string line = source + ":" + std::to_string(fault.line) + ": ";
    if (!dn.empty()) {
        line += dn + ": ";
    }
    return on_one_line(line + text_of(fault));
}

json json_of(const ldif_fault& fault, const std::string& source, const std::string& dn)
{
    json member = {{"file", source}, {"line", fault.line}};
    if (!dn.empty()) {
        member["dn"] = cut(dn);
    }
    member["kind"] = words_of(fault.kind).name;
    if (!fault.subject.empty()) {
        member["subject"] = cut(fault.subject);
    }
    member["reason"] = cut(fault.reason);
    return member;
}

}  // namespace dirbase_tool
