// Random bytes and identifiers: see lutil_uuid.h.
#include "servers/vrnd/libdirbase/base/lutil_uuid.h"

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <mutex>

#include <unistd.h>

#include "libraries/libvrnutil/lutil_md5.h"

namespace {

constexpr std::size_t digest_size = 16;
constexpr std::size_t uuid_length = 36;

// What makes one round of lutil_entropy differ from another.
struct entropy_block {
    std::uint64_t process_counter;  // rounds of this process
    std::uint64_t buffer;           // address of the caller's buffer
    std::uint64_t block;            // address of this block: the thread's stack
    std::uint64_t process;          // process id, raised by one each round
    std::uint64_t time;             // seconds
    std::uint64_t call_counter;     // rounds of this call
};
static_assert(sizeof(entropy_block) == 48, "the digest runs over six words and nothing between them");

std::atomic<std::uint64_t> process_counter = 0;

std::uint64_t address_of(const void* object)
{
    return reinterpret_cast<std::uintptr_t>(object);
}

std::uint64_t seconds()
{
    return static_cast<std::uint64_t>(std::time(nullptr));
}

std::once_flag node_address_made;
unsigned char node_address[6] = {};

std::once_flag clock_sequence_seeded;
std::atomic<std::uint16_t> clock_sequence = 0;

unsigned next_clock_sequence()
{
    std::call_once(clock_sequence_seeded, [] {
        unsigned char seed[2] = {};
        lutil_entropy(seed, sizeof seed);
        clock_sequence = static_cast<std::uint16_t>(seed[0] << 8 | seed[1]);
    });
    return clock_sequence.fetch_add(1) + 1u;
}

}  // namespace

extern "C" {

int lutil_entropy(unsigned char* buffer, std::size_t size)
{
    if (size == 0)
        return 0;
    entropy_block block = {
        process_counter, address_of(buffer), address_of(&block), static_cast<std::uint64_t>(getpid()), seconds(), 0};
    for (std::size_t done = 0; done < size; done += digest_size) {
        block.process_counter = process_counter.fetch_add(1) + 1;
        ++block.process;
        block.time = seconds();
        ++block.call_counter;

        unsigned char digest[digest_size];
        lutil_MD5Context context;
        lutil_MD5Init(&context);
        lutil_MD5Update(&context, reinterpret_cast<const unsigned char*>(&block), sizeof block);
        lutil_MD5Update(&context, buffer, size);
        lutil_MD5Final(digest, &context);
        std::memcpy(buffer + done, digest, std::min(digest_size, size - done));
    }
    return 0;
}

unsigned char* lutil_eaddr(void)
{
    std::call_once(node_address_made, [] {
        lutil_entropy(node_address, sizeof node_address);
        node_address[0] |= 0x80;
    });
    return node_address;
}

std::size_t lutil_uuidstr(char* buffer, std::size_t size)
{
    // Units of 100 nanoseconds as in RFC 4122, 4.1.4, but from an offset two hexadecimal digits short of the RFC's
    // 0x01B21DD213814000. All identifiers have been made that way, so it stays.
    const std::uint64_t time = seconds() * 10000000 + 0x1B21DD2138140;
    const unsigned sequence = next_clock_sequence();
    const unsigned char* node = lutil_eaddr();

    char text[uuid_length + 1];
    const auto low = static_cast<unsigned>(time & 0xFFFFFFFF);
    const auto middle = static_cast<unsigned>(time >> 32 & 0xFFFF);
    const auto high = static_cast<unsigned>(time >> 48 & 0x0FFF) + 0x1000;
    const unsigned sequence_group = (sequence & 0x1FFF) + 0x8000;
    std::snprintf(text, sizeof text, "%08x-%04x-%04x-%04x-%02x%02x%02x%02x%02x%02x", low, middle, high, sequence_group,
                  node[0], node[1], node[2], node[3], node[4], node[5]);
    if (size < sizeof text)
        return 0;
    std::memcpy(buffer, text, sizeof text);
    return uuid_length;
}

}  // extern "C"
