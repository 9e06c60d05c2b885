// BER elements against a slow encoder, and against input that no one should send.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <functional>
#include <limits>
#include <memory>
#include <string>
#include <vector>

#include "libraries/libber/ber_element.h"
#include "tests/libraries/libber/slow_ber.h"

using namespace std::string_literals;
using namespace slow_ber;

namespace {

struct free_element {
    void operator()(BerElement* ber) const { ber_free(ber, 1); }
};
using element = std::unique_ptr<BerElement, free_element>;

std::string written(const BerElement& ber)
{
    return std::string(ber.ber_buf, ber.ber_ptr);
}

berval view(const std::string& bytes)
{
    return {bytes.size(), const_cast<char*>(bytes.data())};
}

// Reads from a block of the exact size, so that the address sanitizer sees one byte too many.
class reading {
public:
    explicit reading(const std::string& bytes) : block_(new char[bytes.size()])
    {
        std::memcpy(block_.get(), bytes.data(), bytes.size());
        const berval value = {bytes.size(), block_.get()};
        EXPECT_EQ(ber_init2(&value, 0, &ber_), 0);
    }
    operator BerElement*() { return &ber_; }
    BerElement* operator->() { return &ber_; }
    std::ptrdiff_t left() const { return ber_.ber_end - ber_.ber_ptr; }

private:
    std::unique_ptr<char[]> block_;
    BerElement ber_;
};

char cn[] = "cn", sn[] = "sn", empty_text[] = "";
berval one = {1, cn}, two = {2, sn}, no_bytes = {7, nullptr};
char* texts[] = {cn, empty_text, sn, nullptr};
berval* values[] = {&one, &no_bytes, &two, nullptr};

TEST(BerPrintf, EveryLetterGivesTheShortestEncoding)
{
    const std::string listed = text("cn") + text("") + text("sn"), three = text("c") + text("") + text("sn");
    const std::string long_text(300, 'x');
    const struct {
        std::function<int(BerElement*)> print;
        std::string expected;
    } cases[] = {
        {[](BerElement* b) { return ber_printf(b, "bbn", 0, 7); }, "\x01\x01\0\x01\x01\xFF\x05\0"s},
        {[](BerElement* b) { return ber_printf(b, "tbtn", 0x80, 1, 0x85); }, "\x80\x01\xFF\x85\0"s},
        {[](BerElement* b) { return ber_printf(b, "ei", 2, -1); }, "\x0A\x01\x02\x02\x01\xFF"s},
        {[](BerElement* b) { return ber_printf(b, "soo", "", "a\0b", 3ul, nullptr, 0ul); },
         text("") + text("a\0b"s) + text("")},
        {[](BerElement* b) { return ber_printf_w(b, "OvV", &two, texts, values); }, text("sn") + listed + three},
        {[](BerElement* b) { return ber_printf(b, "tVvV", 0x81, values, nullptr, nullptr); },
         tlv(0x81, "c") + tlv(0x81, "") + tlv(0x81, "sn")},
        {[&](BerElement* b) {
             return fber_printf(b, "{s", long_text.c_str()) + fber_printf(b, "{sii}", "member", 5, 70'000) +
                    fber_printf(b, "}");
         },
         seq(text(long_text) + seq(text("member") + integer(2, 5) + integer(2, 70'000)))},
        {[](BerElement* b) { return ber_printf(b, "{t{ti}}", 0xA0, 128, 600); }, seq(tlv(0xA0, integer(0x80, 600)))},
        {[](BerElement* b) { return ber_printf(b, "{t{t{i}}}", 0x80, 129, 3); },
         seq(tlv(0x80, tlv(0x81, integer(2, 3))))},
        {[](BerElement* b) { return ber_printf(b, "{te}{}[]", 0x81, 8); }, seq(integer(0x81, 8)) + seq("") + set("")},
        {[](BerElement* b) { return ber_printf(b, "{{e{s[V]}}", 2, "c", values) + ber_printf(b, "{}}"); },
         seq(seq(integer(10, 2) + seq(text("c") + set(three))) + seq(""))},
    };
    for (const auto& row : cases) {
        const element ber(ber_alloc_t(1));
        EXPECT_EQ(row.print(ber.get()), 0);
        EXPECT_EQ(written(*ber), row.expected) << &row - cases;
        EXPECT_EQ(ber->ber_options, 1);
        berval* flat = nullptr;
        ASSERT_EQ(ber_flatten(ber.get(), &flat), 0);
        EXPECT_EQ(std::string(flat->bv_val, flat->bv_len), row.expected);
        ber_bvfree(flat);
    }
}

TEST(BerPrintf, IntegersAreShortestAndComeBack)
{
    std::vector<std::int64_t> numbers = {0, std::numeric_limits<std::int64_t>::min()};
    for (int bit = 0; bit < 63; ++bit) {
        for (const std::int64_t near : {-1, 0, 1}) {
            for (const std::int64_t sign : {-1, 1}) {
                numbers.push_back(sign * ((std::int64_t{1} << bit) + near));
            }
        }
    }
    for (const std::int64_t number : numbers) {
        const element ber(ber_alloc());
        ASSERT_EQ(ber_printf(ber.get(), "I", number), 0);
        ASSERT_EQ(written(*ber), integer(2, number)) << number;
        std::int64_t wide = 0;
        std::int32_t narrow = 0;
        EXPECT_EQ(ber_scanf(reading(written(*ber)), "I", &wide), LBER_INTEGER);
        EXPECT_EQ(wide, number);
        const bool fits = number == static_cast<std::int32_t>(number);
        EXPECT_EQ(ber_scanf(reading(written(*ber)), "i", &narrow), fits ? LBER_INTEGER : LBER_ERROR) << number;
        EXPECT_EQ(narrow, fits ? number : 0);
    }
}

// Prints a tree, holding closings back to give some of them in one run.
void print(BerElement* ber, const node& tree, std::string& closings, std::mt19937& random)
{
    ASSERT_EQ(ber_printf(ber, closings.c_str()), 0);
    closings.clear();
    if (!tree.is_construction()) {
        ASSERT_EQ(ber_printf(ber, "to", tree.tag, tree.bytes.data(), tree.bytes.size()), 0);
        return;
    }
    ASSERT_EQ(ber_printf(ber, "t{", tree.tag), 0);
    for (const node& member : tree.members) {
        print(ber, member, closings, random);
    }
    closings += '}';
    if (random() % 2 == 0) {
        ASSERT_EQ(ber_printf(ber, closings.c_str()), 0);
        closings.clear();
    }
}

node scan(BerElement* ber)
{
    ber_len_t len = 0;
    node read{ber_peek_tag(ber, &len), ""};
    if (!read.is_construction()) {
        char* bytes = nullptr;
        EXPECT_EQ(fber_get_string_len(ber, &bytes, &len), read.tag);
        read.bytes.assign(bytes, len);
        EXPECT_EQ(bytes[len], '\0');
        std::free(bytes);
        return read;
    }
    char* last = nullptr;
    ber_tag_t tag = ber_first_element(ber, &len, &last);
    for (; tag != LBER_DEFAULT && tag != LBER_ERROR; tag = ber_next_element(ber, &len, last)) {
        read.members.push_back(scan(ber));
    }
    EXPECT_EQ(tag, LBER_DEFAULT);
    return read;
}

TEST(BerPrintf, AnyTreeIsEncodedAsTheSlowEncoderDoesAndReadBack)
{
    std::mt19937 random(5);
    for (int run = 0; run < 300; ++run) {
        const node tree = random_tree(random, 6);
        const element ber(ber_alloc());
        std::string closings;
        print(ber.get(), tree, closings, random);
        ASSERT_EQ(ber_printf(ber.get(), closings.c_str()), 0);
        ASSERT_EQ(written(*ber), tree.encoded());
        reading back(tree.encoded());
        ASSERT_EQ(scan(back).encoded(), tree.encoded());
        EXPECT_EQ(back.left(), 0);
    }
}

TEST(BerPrintf, AFailureLastsAndTheElementIsReleased)
{
    const std::string full(LBER_MAX_OPEN, '{'), closed(LBER_MAX_OPEN, '}');
    const std::string bad[] = {"s", "O", "o", "}", "{}]", "q", full + "{", "{}}", "t0", "t1", "t3"};
    const unsigned bad_tags[] = {0, 0x1F, 0xBF, 0x104};
    for (const std::string& format : bad) {
        const element ber(ber_alloc());
        const bool is_tag = format[0] == 't';
        for (std::size_t i = 0; i < (is_tag ? std::size(bad_tags) : 1); ++i) {
            EXPECT_EQ(is_tag ? ber_printf(ber.get(), "ti", bad_tags[i], 1)
                             : ber_printf(ber.get(), format.c_str(), nullptr, 1ul),
                      -1)
                << format;
        }
        EXPECT_EQ(ber_printf(ber.get(), "i", 1), -1);
        berval* flat = &one;
        EXPECT_EQ(ber_flatten(ber.get(), &flat), -1);
        EXPECT_EQ(flat, nullptr);
    }
    for (const char* const format : {"{t}", "[{}t]i"}) {
        EXPECT_EQ(ber_printf(element(ber_alloc()).get(), format, 0x80u, 1), -1) << "the tag of nothing: " << format;
    }
    element ber(ber_alloc());
    EXPECT_EQ(ber_printf(ber.get(), full.c_str()), 0);
    berval* flat = nullptr;
    EXPECT_EQ(ber_flatten(ber.get(), &flat), -1);  // still open
    EXPECT_EQ(ber_printf(ber.get(), closed.c_str()), 0);
    std::string nested;
    for (unsigned i = 0; i < LBER_MAX_OPEN; ++i) {
        nested = seq(nested);
    }
    EXPECT_EQ(written(*ber), nested);
    EXPECT_TRUE(ber_printf(ber.get(), "t", 0x80u) == 0 && ber_flatten(ber.get(), &flat) == -1 && flat == nullptr);
    EXPECT_TRUE(ber_printf(ber.get(), "i", 1) == 0 && ber_flatten(ber.get(), &flat) == 0);
    ber_bvfree(flat);

    char* taken = ber->ber_buf;  // the block outlives the element
    ber_free(ber.release(), 0);
    EXPECT_EQ(std::string(taken, nested.size()), nested);
    std::free(taken);
}

TEST(BerScanf, FormatsInUseReadWhatTheyName)
{
    char *name = nullptr, **list = nullptr;
    berval value{}, *boxed = nullptr, **boxes = nullptr;
    std::int32_t number = 0, second = 0;
    int truth = 0;
    ber_tag_t tag = 0;
    ber_len_t len = 0;

    EXPECT_EQ(ber_scanf_w(reading(seq(text("cn") + text("a\0b"s))), "{ao}", &name, &value), LBER_OCTETSTRING);
    EXPECT_EQ(name + std::string(value.bv_val, value.bv_len + 1), "cna\0b\0"s);
    std::free(name), std::free(value.bv_val);

    for (const auto& [count, group] : {std::pair(2u, text("g1") + text("")), {0u, ""s}}) {
        EXPECT_NE(ber_scanf(reading(seq(integer(2, 1) + seq(group))), "{i{v}}", &number, &list), LBER_ERROR);
        EXPECT_EQ(number, 1);
        ASSERT_EQ(list != nullptr, count == 2);
        if (list != nullptr) {
            EXPECT_EQ(list[0] + "/"s + list[1], "g1/");
            EXPECT_EQ(list[2], nullptr);
            std::free(list[0]), std::free(list[1]), std::free(list);
        }
    }

    // The sequence may hold more than the format reads.
    reading control(seq(seq(text("x")) + text("::1") + integer(2, 1)));
    EXPECT_EQ(ber_scanf(control, "{{v}a}", &list, &name), LBER_OCTETSTRING);
    EXPECT_EQ(list[0] + "/"s + name, "x/::1");
    EXPECT_EQ(control.left(), 0);
    std::free(list[0]), std::free(list), std::free(name);

    EXPECT_EQ(fber_scanf(reading(seq(integer(2, -5) + integer(2, 1 << 30) + "\x01\x01\x01"s)), "{iib}", &number,
                         &second, &truth),
              LBER_BOOLEAN);
    EXPECT_EQ(std::to_string(number) + "/" + std::to_string(second) + "/" + std::to_string(truth), "-5/1073741824/1");

    EXPECT_NE(ber_scanf(reading(seq(set(text("a") + text("b")) + integer(10, 1) + text("log"))), "{[V]eO}", &boxes,
                        &number, &boxed),
              LBER_ERROR);
    EXPECT_EQ(boxes[0]->bv_val + "/"s + boxes[1]->bv_val + "/" + boxed->bv_val, "a/b/log");
    ber_bvecfree(boxes), ber_bvfree(boxed);

    // A construction left open stays entered; the rest is read piece by piece.
    char room[4] = "???";
    ber_len_t size = sizeof(room);
    reading request(tlv(0x66, text("o=x") + "\x05\0"s + tlv(0x80, "abc") + integer(0x81, 3) + text("")) + text("rest"));
    EXPECT_EQ(ber_scanf(request, "{a", &name), LBER_OCTETSTRING);
    EXPECT_EQ(ber_scanf(request, "ntls", &tag, &len, room, &size), 0x80u);
    EXPECT_EQ(name + "/"s + room + std::to_string(tag) + std::to_string(len) + std::to_string(size), "o=x/abc12833");
    std::free(name);
    EXPECT_EQ(ber_skip_tag(request, &len), 0x81u);
    EXPECT_EQ(*request->ber_ptr++, 3);
    EXPECT_EQ(ber_scanf(request, "A}m", &name, &value), LBER_OCTETSTRING);
    EXPECT_EQ(name, nullptr);
    EXPECT_EQ(std::string(value.bv_val, value.bv_len), "rest");
    EXPECT_EQ(ber_scanf(request, ""), 0u);
    EXPECT_EQ(ber_scanf(request, "x"), LBER_ERROR);
}

TEST(BerScanf, WhatIsNotThereIsAFailureThatLeavesNothingBehind)
{
    char* a = cn;
    char** v = texts;
    berval o = one, *O = &one, **V = values, m = one;
    std::int32_t i = 0;
    const std::string good =
        seq(text("a") + text("o") + text("O") + seq(text("v")) + set(text("V")) + text("m") + integer(2, 1));
    const auto scan_all = [&](BerElement* ber, const char* format) {
        a = cn, v = texts, o = m = one, O = &one, V = values;
        return ber_scanf(ber, format, &a, &o, &O, &v, &V, &m, &i);
    };
    const char* whole = "{aoO{v}[V]mi}";
    reading kept(good);
    ASSERT_EQ(scan_all(kept, whole), LBER_INTEGER);
    std::free(a), std::free(o.bv_val), ber_bvfree(O), std::free(v[0]), std::free(v), ber_bvecfree(V);

    const auto expect_nothing = [&](const std::string& bytes, const char* format) {
        reading from(bytes);
        EXPECT_EQ(scan_all(from, format), LBER_ERROR);
        EXPECT_EQ(from.left(), static_cast<std::ptrdiff_t>(bytes.size()));
        EXPECT_TRUE(a == nullptr && o.bv_val == nullptr && O == nullptr && v == nullptr && V == nullptr &&
                    m.bv_val == nullptr);
    };
    for (std::size_t cut = 0; cut < good.size(); ++cut) {
        expect_nothing(good.substr(0, cut), whole);
        std::string shorter = good.substr(0, cut);  // with the outer length mended, so the members are cut
        if (cut >= 2) {
            shorter[1] = static_cast<char>(cut - 2);
            expect_nothing(shorter, whole);
            expect_nothing(shorter + good.substr(cut), whole);  // and what follows isn't taken for members
        }
    }
    expect_nothing(good, "{aoO{v}[V]mi}x");
    scan_all(reading(good), "{aoO{q");
    EXPECT_TRUE(a == nullptr && o.bv_val == nullptr && O == nullptr);
}

TEST(BerRead, HostileHeadersAndContentsAreRefused)
{
    const std::string ones(9, '\xFF');
    const struct {
        std::string bytes;
        const char* format;
        bool legal;
    } cases[] = {
        {"\x04\x83\0\0\1a"s, "m", true},  // longer than need be
        {"\x04\x8A\0\0\0\0\0\0\0\0\0\1a"s, "m", true},
        {"\x04\x02"
         "a",
         "m", false},  // more than is left
        {"\x04\x80"
         "a\0\0"s,
         "m", false},  // indefinite
        {"\x24\x80\x04\1a\0\0"s, "m", false},
        {"\x30\x80\0\0"s, "{", false},
        {"\x04\xFF" + ones, "m", false},
        {"\x04\x88" + ones, "m", false},  // as long as can be
        {"\x04\x89\1\0\0\0\0\0\0\0\0a"s, "m", false},
        {"\x04\x84\xFF\xFF\xFF\xFE"
         "a",
         "m", false},
        {"\x04\x82\0"s, "m", false},
        {"\x04", "m", false},
        {"", "m", false},
        {"\x1F\1a"s, "m", false},  // tags of several bytes, and none
        {"\x9F\x21\1a"s, "x", false},
        {"\0\0"s, "x", false},
        {"\x24\3\4\1a"s, "m", false},  // a string in pieces
        {"\xA4\3\4\1a"s, "m", false},
        {"\x02\1a"s, "m", false},  // a universal tag of something else
        {"\x04\1a"s, "I", false},
        {"\x0A\1a"s, "I", true},
        {"\x02\x08\0\0\0\0\0\0\0\1"s, "I", true},  // in more bytes than need be
        {"\x02\1\1"s, "b", false},
        {"\x85\0"s, "I", false},  // contents that are none
        {"\x02\x09" + std::string(9, '\0'), "I", false},
        {"\x01\0"s, "b", false},
        {"\x01\2\1\1"s, "b", false},
        {"\x05\1a"s, "n", false},
        {"\x04\3a\0b"s, "a", false},  // a text that would end too soon
        {"\x04\3abc"s, "{", false},   // no construction
        {"\x84\0"s, "{}", true},      // nor this, but written so by some
        {"\xBE\0"s, "[]", true},
    };
    for (const auto& row : cases) {
        union {
            char* text;
            berval value;
            std::int64_t number;
            int truth;
        } out{};
        EXPECT_EQ(ber_scanf(reading(row.bytes), row.format, &out) != LBER_ERROR, row.legal) << &row - cases;
    }

    reading overlong(seq("\x04\5a"s) + "bcdefg");  // a member that ends behind its construction
    ber_len_t len = 0;
    char* last = nullptr;
    EXPECT_EQ(ber_first_element(overlong, &len, &last), LBER_ERROR);
    EXPECT_TRUE(overlong->ber_ptr == overlong->ber_buf && len == 0 && last == nullptr);
    EXPECT_EQ(ber_scanf(reading(seq("\x04\5a"s) + "bcdefg"), "{x", nullptr), LBER_ERROR);
    EXPECT_EQ(ber_first_element(reading(text("abc")), &len, &last), LBER_ERROR);
    EXPECT_EQ(ber_first_element(reading(set("")), &len, &last), LBER_DEFAULT);
    EXPECT_EQ(ber_scanf(reading(seq("")), (std::string(LBER_MAX_OPEN, '{') + "{").c_str()), LBER_ERROR);
}

TEST(BerRead, NestingOfAnyDepthIsWalkedWithoutRecursion)
{
    constexpr std::size_t depth = 100'000;
    std::string reversed;  // the innermost first, each header back to front
    while (reversed.size() < 5 * depth) {
        for (std::size_t i = 0, size = reversed.size(); i < 3; ++i, size >>= 8) {
            reversed += static_cast<char>(size);
        }
        reversed += "\x83\xA2";
    }
    reading nested(std::string(reversed.rbegin(), reversed.rend()));
    ber_len_t len = 0;
    char* last = nullptr;
    std::size_t walked = 1;
    while (ber_first_element(nested, &len, &last) == 0xA2) {
        ++walked;
    }
    EXPECT_EQ(walked, depth);
    EXPECT_EQ(nested.left(), 0);
}

TEST(BerElement, EachKindRefusesTheCallsOfTheOther)
{
    const std::string bytes = text("abc");
    const berval value = view(bytes), broken = {3, nullptr}, none = {0, nullptr};
    BerElement record;
    ber_len_t len = 0;
    char* out = cn;
    EXPECT_EQ(ber_init2(&broken, 0, &record), -1);
    EXPECT_EQ(ber_scanf(&record, "a", &out), LBER_ERROR);
    EXPECT_EQ(out, nullptr);
    EXPECT_EQ(ber_init2(nullptr, 0, &record), -1);
    EXPECT_EQ(ber_init2(&none, 0, &record), 0);
    EXPECT_EQ(ber_peek_tag(&record, &len), LBER_ERROR);
    EXPECT_EQ(ber_init(&broken), nullptr);

    const element copy(ber_init(&value)), writer(ber_alloc());
    EXPECT_NE(copy->ber_buf, bytes.data());
    EXPECT_EQ(ber_peek_tag(copy.get(), &len), LBER_OCTETSTRING);
    EXPECT_EQ(len, 3u);
    out = cn;
    EXPECT_EQ(fber_get_string_len(copy.get(), nullptr, &len), LBER_ERROR);
    EXPECT_EQ(fber_get_string_len(copy.get(), &out, nullptr), LBER_ERROR);
    EXPECT_TRUE(len == 0 && out == nullptr && copy->ber_ptr == copy->ber_buf);
    EXPECT_EQ(ber_printf(copy.get(), "n"), -1);
    EXPECT_EQ(ber_printf(writer.get(), "n"), 0);
    EXPECT_EQ(ber_skip_tag(writer.get(), &len), LBER_ERROR);
    EXPECT_EQ(ber_scanf(writer.get(), "n"), LBER_ERROR);

    EXPECT_EQ(fber_init2(&value, 1, &record), 0);
    EXPECT_EQ(record.ber_options, 1);
    fber_free(&record, 1);  // the record and the bytes are the caller's
    EXPECT_EQ(bytes, text("abc"));
    ber_free(nullptr, 1);
}

}  // namespace
