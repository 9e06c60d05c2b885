// The case tables, the walk through them, and the pages made of them.
#include "servers/vrnd/libdirbase/base/uni_case.h"

#include "servers/vrnd/libdirbase/base/uni_case_pages.h"

#include "servers/vrnd/libdirbase/base/uni_case_tables.inc"

namespace {

constexpr std::int32_t table_size = 512;

std::int32_t map(std::int32_t character, const std::int8_t* table, const UniCaseRange* range)
{
    if (character < 0)
        return character;
    if (character < table_size)
        return character + table[character];
    for (; range->first != 0 && range->first <= character; ++range) {
        if (character <= range->last)
            return character + range->table[character - range->first];
    }
    return character;
}

void map_all(std::int32_t* text, const std::int8_t* table, const UniCaseRange* range)
{
    for (; text != nullptr && *text != 0; ++text)
        *text = map(*text, table, range);
}

// Gives pages to what has a mapping, in order of need.
class page_writer {
public:
    constexpr void write(std::int32_t first, std::int32_t last, const std::int8_t* table)
    {
        for (std::int32_t character = first; character <= last; ++character) {
            if (table[character - first] != 0)
                place(static_cast<std::size_t>(character)) = table[character - first];
        }
    }

    constexpr const uni_case_pages& result() const { return result_; }

private:
    constexpr std::int8_t& place(std::size_t character)
    {
        std::uint8_t& page = result_.page_of.at(character / uni_case_pages::page_size);
        if (page == 0)
            page = ++last_page_;
        return result_.pages.at(page).at(character % uni_case_pages::page_size);
    }

    uni_case_pages result_;
    std::uint8_t last_page_ = 0;  // page 0 stays empty
};

constexpr uni_case_pages pages_of(const std::int8_t* table, const UniCaseRange* range)
{
    page_writer writer;
    writer.write(0, table_size - 1, table);
    for (; range->first != 0; ++range)
        writer.write(range->first, range->last, range->table);
    return writer.result();
}

}  // namespace

constexpr uni_case_pages uni_upper_pages = pages_of(UniUpperTable, UniUpperRange);
constexpr uni_case_pages uni_lower_pages = pages_of(UniLowerTable, UniLowerRange);

extern "C" {

std::int32_t UniToupper(std::int32_t character)
{
    return map(character, UniUpperTable, UniUpperRange);
}

std::int32_t UniTolower(std::int32_t character)
{
    return map(character, UniLowerTable, UniLowerRange);
}

std::int32_t* UniStrupr(std::int32_t* text)
{
    map_all(text, UniUpperTable, UniUpperRange);
    return text;
}

std::int32_t* UniStrlwr(std::int32_t* text)
{
    map_all(text, UniLowerTable, UniLowerRange);
    return text;
}

}  // extern "C"
