// Any bytes, read by each of the formats that the server uses and by walks through whatever is there.
//
// Input: the format (a byte), then what is read. A format that reads gives values that lie within the input; one that
// fails gives nulls and leaves the position alone.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <memory>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libber/ber_element.h"

using fuzz_support::expect;

namespace {

// Values of one kind stand in one argument: the formats name none twice, but for the numbers.
struct arguments {
    char* a = nullptr;
    berval o = {0, nullptr};
    berval* O = nullptr;
    char** v = nullptr;
    berval** V = nullptr;
    std::int32_t i = 0, i2 = 0;
    std::int64_t I = 0;
    int b = 0;
    ber_tag_t t = 0, T = 0;
    ber_len_t l = 0;
    char s[8] = "";
    ber_len_t size = sizeof(s);

    bool is_empty() const
    {
        return a == nullptr && o.bv_val == nullptr && O == nullptr && v == nullptr && V == nullptr;
    }

    void release()
    {
        std::free(a);
        std::free(o.bv_val);
        ber_bvfree(O);
        for (char** text = v; text != nullptr && *text != nullptr; ++text) {
            std::free(*text);
        }
        std::free(v);
        ber_bvecfree(V);
    }
};

ber_tag_t scan(BerElement* ber, unsigned format, arguments& x)
{
    switch (format % 14) {
    case 0: return ber_scanf_w(ber, "a", &x.a);
    case 1: return ber_scanf(ber, "{a", &x.a);
    case 2: return ber_scanf_w(ber, "{ao}", &x.a, &x.o);
    case 3: return ber_scanf(ber, "{i{v}}", &x.i, &x.v);
    case 4: return ber_scanf(ber, "{{v}a}", &x.v, &x.a);
    case 5: return ber_scanf(ber, "{iiO}", &x.i, &x.i2, &x.O);
    case 6: return fber_scanf(ber, "{iib}", &x.i, &x.i2, &x.b);
    case 7: return ber_scanf(ber, "{e{a[V]}}", &x.i, &x.a, &x.V);
    case 8: return ber_scanf(ber, "{[v]{V}Oao}", &x.v, &x.V, &x.O, &x.a, &x.o);
    case 9: return ber_scanf(ber, "{{xA}[I]ntTls", &x.a, &x.I, &x.t, &x.T, &x.l, x.s, &x.size);
    case 10: return ber_scanf(ber, "aOovx", &x.a, &x.O, &x.o, &x.v);
    case 11: return ber_scanf(ber, "VaO", &x.V, &x.a, &x.O);
    case 12: return ber_scanf(ber, "{o{O[V{a]v}q", &x.o, &x.O, &x.V, &x.a, &x.v);
    default: return fber_get_string_len(ber, &x.o.bv_val, &x.o.bv_len);
    }
}

// Goes through all that is there, into each construction that can be entered. Returns the number of values.
std::size_t walk(BerElement* ber)
{
    std::size_t count = 0;
    const char* before = ber->ber_ptr;
    ber_len_t len = 0;
    for (ber_tag_t tag = ber_peek_tag(ber, &len); tag != LBER_ERROR; tag = ber_peek_tag(ber, &len)) {
        expect(len < static_cast<ber_len_t>(ber->ber_end - ber->ber_ptr), "the content is all there");
        char* last = nullptr;
        if ((tag & 0x20) != 0 && ber_first_element(ber, &len, &last) != LBER_ERROR) {
            expect(last <= ber->ber_end, "a construction ends within the whole");
        } else {
            expect((tag & 0x20) != 0 ? ber_skip_tag(ber, &len) == tag : ber_scanf(ber, "x") == tag,
                   "a value is passed");
        }
        expect(ber->ber_ptr > before, "every step goes on");
        before = ber->ber_ptr;
        ++count;
    }
    return count;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0) {
        return 0;
    }
    const std::unique_ptr<char[]> block(new char[size - 1]);
    std::memcpy(block.get(), data + 1, size - 1);
    const berval value = {size - 1, block.get()};
    BerElement ber;
    expect(ber_init2(&value, 0, &ber) == 0, "any bytes can be tried");

    arguments read;
    const ber_tag_t result = scan(&ber, data[0], read);
    expect(result != LBER_ERROR || (read.is_empty() && ber.ber_ptr == ber.ber_buf), "a failure leaves nothing");
    expect(ber.ber_ptr >= ber.ber_buf && ber.ber_ptr <= ber.ber_end, "the position is within the input");
    expect(read.O == nullptr || read.O->bv_len < size, "a value is no longer than the input");
    read.release();

    ber_init2(&value, 0, &ber);
    expect(walk(&ber) < size, "values take room");

    ber_init2(&value, 0, &ber);
    ber_len_t len = 0;
    char* last = nullptr;
    std::size_t members = 0;
    for (ber_tag_t tag = ber_first_element(&ber, &len, &last); tag != LBER_DEFAULT && tag != LBER_ERROR;
         tag = ber_next_element(&ber, &len, last)) {
        expect(ber_scanf(&ber, "x") == tag, "a member that is announced is there");
        expect(++members < size && ber.ber_ptr <= last, "and ends within its construction");
    }
    return 0;
}
