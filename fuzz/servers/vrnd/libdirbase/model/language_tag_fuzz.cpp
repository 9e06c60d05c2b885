// Splitting of any name: base, ";" and tag give the name back, and all questions about tags agree with each other.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <regex>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"

using fuzz_support::expect;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const fuzz_support::exact_text input(data, size);
    const std::string name = input.c_str();
    const bool binary = name.size() >= 7 && vrn_strcasecmp(name.c_str() + name.size() - 7, ";binary") == 0;
    const std::size_t mark = binary ? name.npos : name.rfind(';');
    const bool too_long = mark != name.npos && name.size() - mark - 1 > longest_language_tag;

    char* base = nullptr;
    char* tag = nullptr;
    const int result = parse_language_tags(input.c_str(), &base, &tag, LANGUAGE_BASE_AND_TAG, 1);
    expect(result == (too_long ? 21 : 0), "only a tag that is too long is refused");
    const bool split = result == 0 && mark != name.npos;
    expect((base != nullptr) == split && (tag != nullptr) == split, "a name with a tag gives both parts");
    if (split) {
        expect(vrn_strcasecmp((std::string(base) + ";" + tag).c_str(), name.c_str()) == 0,
               "both parts give the name back");
        expect(std::none_of(tag, tag + std::strlen(tag), [](char c) { return c >= 'A' && c <= 'Z'; }), "in lower case");
        expect(strtagcmp(tag, name.c_str() + mark + 1) == 0, "a tag is equal to itself");
        static const std::regex form("lang-[a-z]+(-[a-z0-9]+)*");
        const bool valid = std::regex_match(tag, form);
        expect((is_valid_language_tag(tag) == 1) == valid, "a valid tag has the form of one");
        expect(contains_valid_language_tag(input.c_str()) == valid, "and makes a name with a valid tag");
    } else {
        expect(!contains_valid_language_tag(input.c_str()), "a name without a tag has no valid one");
    }
    char buffer[language_tag_buffer];
    std::size_t length = 0;
    expect(parse_language_tags_with_buffer(input.c_str(), nullptr, buffer, &length, LANGUAGE_TAG) == result,
           "same result");
    expect(std::string(buffer) == (split ? tag : "") && length == std::strlen(buffer), "and the same tag");
    std::free(base);
    std::free(tag);

    char* first = nullptr;
    char* second = nullptr;
    if (verifyAttributeMapping(input.c_str(), &second, &first) == 0) {
        expect(is_attr_name_valid(second, static_cast<int>(std::strlen(second))),
               "a mapping leads to a well-formed name");
        std::free(first);
        std::free(second);
    }
    return 0;
}
