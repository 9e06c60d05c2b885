// A tree of values written, read back, and written again from what was read: twice the same bytes.
//
// Input: a program of bytes. Each opens a construction, closes some, or writes a value of the bytes that follow.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "libraries/libber/ber_element.h"

using fuzz_support::expect;

namespace {

struct free_element {
    void operator()(BerElement* ber) const { ber_free(ber, 1); }
};
using element = std::unique_ptr<BerElement, free_element>;

// Hands out the input from front to back; zeros behind its end.
class input {
public:
    input(const std::uint8_t* data, std::size_t size) : data_(data), left_(size) {}
    bool is_empty() const { return left_ == 0; }
    unsigned byte() { return left_ == 0 ? 0 : (--left_, *data_++); }
    std::string bytes(std::size_t count)
    {
        std::string taken;
        while (taken.size() < count && !is_empty()) {
            taken += static_cast<char>(byte());
        }
        taken.resize(count, 'x');
        return taken;
    }

private:
    const std::uint8_t* data_;
    std::size_t left_;
};

// The outer construction holds all, so that one value is written.
void write(BerElement* ber, input from)
{
    unsigned open = 1;
    expect(ber_printf(ber, "{") == 0, "the first is opened");
    while (!from.is_empty()) {
        const unsigned step = from.byte();
        const unsigned small = step >> 3;
        int result = 0;
        switch (step & 7) {
        case 0: result = ber_printf(ber, "b", static_cast<int>(small)); break;
        case 1: {
            std::uint64_t number = 0;
            for (unsigned i = 0; i < small % 9; ++i) {
                number = number << 8 | from.byte();
            }
            result = ber_printf(ber, "I", static_cast<std::int64_t>(number));
            break;
        }
        case 2: result = ber_printf(ber, "n"); break;
        case 3:
        case 4: {
            const std::string value = from.bytes((step & 7) == 3 ? small : small * 100u);
            result = ber_printf(ber, "o", value.data(), value.size());
            break;
        }
        case 5:
        case 6:
            result = ber_printf(ber, (step & 7) == 5 ? "t{" : "t[", 0xA0u + small % 31);
            expect((result == 0) == (open < LBER_MAX_OPEN), "so many may be open");
            if (result != 0) {
                return;
            }
            ++open;
            break;
        default: {
            const unsigned count = small < open ? small : open - 1;
            result = ber_printf(ber, std::string(count, '}').c_str());
            open -= count;
            break;
        }
        }
        expect(result == 0, "it is written");
    }
    expect(ber_printf(ber, std::string(open, ']').c_str()) == 0, "all are closed");
}

// Reads one value and writes it behind what `to` holds.
void copy(BerElement* from, BerElement* to)
{
    ber_len_t len = 0;
    ber_tag_t tag = ber_peek_tag(from, &len);
    if ((tag & 0x20) != 0) {
        expect(ber_printf(to, "t{", tag) == 0, "a construction is opened");
        char* last = nullptr;
        for (tag = ber_first_element(from, &len, &last); tag != LBER_DEFAULT;
             tag = ber_next_element(from, &len, last)) {
            expect(tag != LBER_ERROR, "a member is there");
            copy(from, to);
        }
        expect(from->ber_ptr == last && ber_printf(to, "}") == 0, "a construction is closed");
        return;
    }
    int result = -1;
    if (tag == LBER_BOOLEAN) {
        int truth = 0;
        expect(ber_scanf(from, "b", &truth) == tag, "it is read");
        result = ber_printf(to, "b", truth);
    } else if (tag == LBER_INTEGER) {
        std::int64_t number = 0;
        expect(ber_scanf(from, "I", &number) == tag, "it is read");
        result = ber_printf(to, "I", number);
    } else if (tag == LBER_NULL) {
        expect(ber_scanf(from, "n") == tag, "it is read");
        result = ber_printf(to, "n");
    } else {
        berval value = {0, nullptr};
        expect(ber_scanf(from, "o", &value) == tag, "it is read");
        result = ber_printf(to, "O", &value);
        std::free(value.bv_val);
    }
    expect(result == 0, "it is written again");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const element first(ber_alloc_t(1)), second(ber_alloc());
    write(first.get(), input(data, size));
    berval* flat = nullptr;
    if (ber_flatten(first.get(), &flat) != 0) {
        return 0;  // too much was open
    }
    BerElement reading;
    expect(ber_init2(flat, 0, &reading) == 0, "it can be read");
    copy(&reading, second.get());
    expect(reading.ber_ptr == reading.ber_end, "nothing is left");
    expect(std::string(second->ber_buf, second->ber_ptr) == std::string(flat->bv_val, flat->bv_len), "twice the same");
    ber_bvfree(flat);
    return 0;
}
