// Random bytes and identifiers. The digest's functions are met on their way from the library, so that what enters into
// a result can be looked at and the result made again.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <iterator>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include <dlfcn.h>
#include <unistd.h>

#include "libraries/libvrnutil/lutil_md5.h"
#include "servers/vrnd/libdirbase/base/lutil_uuid.h"

namespace {

using bytes = std::vector<unsigned char>;

// While set, takes what this thread's digests run over.
thread_local std::vector<bytes>* digested = nullptr;

}  // namespace

extern "C" void lutil_MD5Update(lutil_MD5Context* context, const unsigned char* data, std::size_t length)
{
    static const auto next = reinterpret_cast<decltype(lutil_MD5Update)*>(dlsym(RTLD_NEXT, "lutil_MD5Update"));
    if (digested != nullptr)
        digested->emplace_back(data, data + length);
    next(context, data, length);
}

namespace {

bytes md5(const bytes& first, const bytes& second)
{
    lutil_MD5Context context;
    lutil_MD5Init(&context);
    lutil_MD5Update(&context, first.data(), first.size());
    lutil_MD5Update(&context, second.data(), second.size());
    bytes digest(16);
    lutil_MD5Final(digest.data(), &context);
    return digest;
}

std::array<std::uint64_t, 6> words_of(const bytes& block)
{
    std::array<std::uint64_t, 6> words = {};
    EXPECT_EQ(block.size(), sizeof words);
    std::memcpy(words.data(), block.data(), std::min(block.size(), sizeof words));
    return words;
}

TEST(LutilEntropy, EachRoundIsTheDigestOfTheBlockAndTheBuffer)
{
    std::uint64_t last_counter = 0;
    for (const std::size_t size : {1u, 6u, 16u, 17u, 50u}) {
        bytes buffer(size, 0xA5);
        bytes expected = buffer;
        std::vector<bytes> fed;
        digested = &fed;
        EXPECT_EQ(lutil_entropy(buffer.data(), size), 0);
        digested = nullptr;

        const std::size_t rounds = (size + 15) / 16;
        ASSERT_EQ(fed.size(), 2 * rounds) << size;
        for (std::size_t round = 1; round <= rounds; ++round) {
            const bytes& block = fed[2 * round - 2];
            const auto words = words_of(block);
            EXPECT_TRUE(last_counter == 0 || words[0] == last_counter + 1);
            last_counter = words[0];
            EXPECT_EQ(words[1], reinterpret_cast<std::uintptr_t>(buffer.data()));
            EXPECT_EQ(words[2], words_of(fed[0])[2]);
            EXPECT_EQ(words[3], static_cast<std::uint64_t>(getpid()) + round);
            EXPECT_NEAR(static_cast<double>(words[4]), static_cast<double>(std::time(nullptr)), 60);
            EXPECT_EQ(words[5], round);

            EXPECT_EQ(fed[2 * round - 1], expected) << "the whole buffer as it stands";
            const bytes digest = md5(block, expected);
            const std::size_t done = 16 * (round - 1);
            std::copy_n(digest.begin(), std::min<std::size_t>(16, size - done),
                        expected.begin() + static_cast<std::ptrdiff_t>(done));
        }
        EXPECT_EQ(buffer, expected) << size;
    }
    EXPECT_EQ(lutil_entropy(nullptr, 0), 0);
}

// Runs `make` `rounds` times in each of `count` threads at once; returns everything that was made.
template <typename Make>
auto from_many_threads(std::size_t count, std::size_t rounds, Make make)
{
    using result = decltype(make());
    std::vector<std::vector<result>> made(count);
    std::vector<std::thread> threads;
    for (std::vector<result>& mine : made) {
        threads.emplace_back([&] {
            for (std::size_t i = 0; i < rounds; ++i)
                mine.push_back(make());
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    std::vector<result> all;
    for (std::vector<result>& mine : made)
        std::move(mine.begin(), mine.end(), std::back_inserter(all));
    return all;
}

TEST(LutilEntropy, BytesFromManyThreadsDiffer)
{
    const auto blocks = from_many_threads(8, 500, [] {
        std::array<unsigned char, 16> block = {};
        lutil_entropy(block.data(), block.size());
        return block;
    });
    EXPECT_EQ(std::set(blocks.begin(), blocks.end()).size(), 8u * 500u);
}

TEST(LutilEaddr, TheSameBytesForEveryThreadWithTheTopBitSet)
{
    const auto found = from_many_threads(8, 1, [] {
        const unsigned char* address = lutil_eaddr();
        return std::make_pair(address, bytes(address, address + 6));
    });
    for (const auto& [address, value] : found) {
        EXPECT_EQ(address, lutil_eaddr());
        EXPECT_EQ(value, found[0].second);
        EXPECT_NE(value[0] & 0x80, 0);
    }
}

std::string new_uuid()
{
    char text[37];
    EXPECT_EQ(lutil_uuidstr(text, sizeof text), 36u);
    return text;
}

std::uint64_t hex(const std::string& text)
{
    return std::strtoull(text.c_str(), nullptr, 16);
}

TEST(LutilUuidstr, TheGroupsHoldTheTimeTheSequenceAndTheNode)
{
    std::uint64_t last_sequence = hex(new_uuid().substr(19, 4));
    for (int round = 0; round < 3; ++round) {
        const std::string text = new_uuid();
        std::string shape = text;
        std::replace_if(
            shape.begin(), shape.end(), [](char c) { return std::strchr("0123456789abcdef", c) != nullptr; }, 'x');
        ASSERT_EQ(shape, "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx") << text;

        const std::uint64_t time_high = hex(text.substr(14, 4)) - 0x1000;
        const std::uint64_t time = time_high << 48 | hex(text.substr(9, 4)) << 32 | hex(text.substr(0, 8));
        const std::uint64_t units = time - 477316125000000;  // 0x1B21DD2138140
        EXPECT_EQ(units % 10000000, 0u);
        EXPECT_NEAR(static_cast<double>(units) / 1e7, static_cast<double>(std::time(nullptr)), 60);

        const std::uint64_t sequence = hex(text.substr(19, 4));
        EXPECT_EQ(sequence - 0x8000, (last_sequence - 0x8000 + 1) % 8192) << text;
        last_sequence = sequence;
        for (std::size_t i = 0; i < 6; ++i) {
            EXPECT_EQ(hex(text.substr(24 + 2 * i, 2)), lutil_eaddr()[i]) << text;
        }
    }
}

TEST(LutilUuidstr, ATextThatDoesNotFitIsNotWritten)
{
    for (const std::size_t size : {0u, 1u, 36u}) {
        std::string buffer(37, '#');
        EXPECT_EQ(lutil_uuidstr(buffer.data(), size), 0u);
        EXPECT_EQ(buffer, std::string(37, '#'));
    }
    EXPECT_EQ(lutil_uuidstr(nullptr, 0), 0u);
    char exact[37];
    EXPECT_EQ(lutil_uuidstr(exact, sizeof exact), 36u);
    EXPECT_EQ(std::strlen(exact), 36u);
}

TEST(LutilUuidstr, IdentifiersFromManyThreadsDifferWithinOneSecond)
{
    const auto all = from_many_threads(8, 1000, new_uuid);  // no more than the sequence tells apart
    EXPECT_EQ(std::set(all.begin(), all.end()).size(), 8000u);
}

}  // namespace
