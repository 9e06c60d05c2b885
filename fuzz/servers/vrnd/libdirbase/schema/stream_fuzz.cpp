// The readers of the small productions: the input's first byte picks one, the rest is its text. What a reader of a list
// returns is printed and read again.
#include <algorithm>
#include <climits>
#include <cstring>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

namespace {

using fuzz_support::expect;

bool same_text(const csgl_string& a, const csgl_string& b)
{
    return std::strcmp(a, b) == 0;
}

template <typename Texts>
bool same_texts(const Texts& a, const Texts& b)
{
    return std::equal(a.begin(), a.end(), b.begin(), b.end(), same_text);
}

// The second reading: an exception here is a finding, not the input's fault.
template <typename Work>
void read_back(Work&& work)
{
    try {
        work();
    } catch (const exc_t&) {
        expect(false, "what is printed can be read again");
    }
}

// A factory behind the keyword that a printer puts in front.
class printed {
public:
    explicit printed(const csgl_string& text) : text_(text), factory_(text_, "printed")
    {
        expect(same_text(ldcf_stream::descr(factory_), "KEYWORD"), "a printed list begins with its keyword");
    }
    ldcf_token_factory& factory() { return factory_; }

private:
    csgl_string text_;
    ldcf_token_factory factory_;
};

void read_oids(ldcf_token_factory& factory)
{
    const ldcf_names names = ldcf_stream::oids(factory);
    const csgl_string text = ldcf_stream::oids("KEYWORD", names);
    if (names.empty()) {
        expect(text.empty(), "no oids print as nothing");
        return;
    }
    read_back([&] {
        printed again(text);
        expect(same_texts(ldcf_stream::oids(again.factory()), names), "printed oids read back");
        expect(again.factory().empty(), "nothing stands behind printed oids");
    });
}

void read_qdescrs(ldcf_token_factory& factory)
{
    csgl_string primary;
    const ldcf_names names = ldcf_stream::qdescrs(factory, primary);
    expect(names.count(primary) == 1, "the primary name is one of the names");

    read_back([&] {
        printed again(ldcf_stream::qdescrs("KEYWORD", names, primary));
        csgl_string primary_again;
        expect(same_texts(ldcf_stream::qdescrs(again.factory(), primary_again), names), "printed names read back");
        expect(same_text(primary_again, primary), "the primary name reads back as such");
        expect(again.factory().empty(), "nothing stands behind printed names");
    });
}

void read_qdstrings(ldcf_token_factory& factory)
{
    const csgl_vector<csgl_string> texts = ldcf_stream::qdstrings(factory);
    std::string list = "( ";
    for (const csgl_string& text : texts) {
        list += std::string("'") + text.c_str() + "' ";
    }
    list += ")";
    read_back([&] {
        ldcf_token_factory again(list.c_str(), "printed");
        expect(same_texts(ldcf_stream::qdstrings(again), texts), "quoted texts read back in their order");
    });
}

void read_qnoid(ldcf_token_factory& factory)
{
    const std::string oid = ldcf_stream::qnoid(factory).c_str();
    expect(!oid.empty() && oid.find_first_not_of("0123456789.") == oid.npos, "a numeric oid has digits and dots");
    expect(oid.front() != '.' && oid.back() != '.' && oid.find("..") == oid.npos, "dots stand between digits");
    for (const std::string& form : {oid, "'" + oid + "'", "' " + oid + "\n'"}) {
        read_back([&] {
            ldcf_token_factory again(form.c_str(), "printed");
            expect(same_text(ldcf_stream::qnoid(again), oid.c_str()), "an oid is the same with quotes and without");
        });
    }
}

void read_optlen(ldcf_token_factory& factory)
{
    const int length = ldcf_stream::optlen(factory);
    expect(length >= 0, "a length isn't negative");
    const csgl_string consumed = factory.current_token();
    if (consumed.empty()) {
        expect(length == 0, "what is no number is no length");
        expect(ldcf_token(factory).type() != token_number, "a number is consumed");
    } else {
        expect(std::strspn(consumed, "0123456789") == consumed.length(), "only digits are consumed");
        const std::size_t zeros = std::min<std::size_t>(consumed.length() - 1, std::strspn(consumed, "0"));
        const std::string value = consumed.c_str() + zeros;
        expect(value.size() > 9 ? length >= 1'000'000'000 : length == std::stoi(value), "the number's value");
    }
}

using reader = void (*)(ldcf_token_factory& factory);
constexpr reader readers[] = {
    [](ldcf_token_factory& f) { expect(!ldcf_stream::oid(f).empty(), "an object id isn't empty"); },
    read_oids,
    read_qnoid,
    read_optlen,
    [](ldcf_token_factory& f) { expect(!ldcf_stream::qdstring(f).empty(), "a quoted text isn't empty"); },
    read_qdstrings,
    [](ldcf_token_factory& f) { expect(!ldcf_stream::descr(f).empty(), "a name isn't empty"); },
    [](ldcf_token_factory& f) { expect(!ldcf_stream::qdescr(f).empty(), "a quoted name isn't empty"); },
    read_qdescrs,
};

}  // namespace

// '0' to '8' pick the readers in their order; any other byte picks one, too.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0) {
        return 0;
    }
    const fuzz_support::exact_text text(data + 1, size - 1);
    const reader read = readers[static_cast<std::uint8_t>(data[0] - '0') % std::size(readers)];
    ldcf_token_factory factory(text.c_str(), "input");
    try {
        read(factory);
    } catch (const exc_t& failure) {
        expect(std::strcmp(failure.file(), "input") == 0, "a failure names its source");
        expect(failure.line() == factory.line(), "a failure names its line");
    }
    return 0;
}
