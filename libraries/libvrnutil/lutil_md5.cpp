// MD5 by libmd, whose context lives in the room of ours.
#include "libraries/libvrnutil/lutil_md5.h"

#include <sys/types.h>

#include <md5.h>

#include <new>
#include <type_traits>

static_assert(sizeof(MD5_CTX) <= sizeof(lutil_MD5Context::room) && alignof(MD5_CTX) <= alignof(lutil_MD5Context));
static_assert(std::is_trivially_copyable_v<MD5_CTX> && std::is_trivially_destructible_v<MD5_CTX>);
static_assert(MD5_DIGEST_LENGTH == 16);

namespace {

MD5_CTX* context_of(lutil_MD5Context* context)
{
    return std::launder(reinterpret_cast<MD5_CTX*>(context->room));
}

}  // namespace

extern "C" {

void lutil_MD5Init(lutil_MD5Context* context)
{
    MD5Init(new (context->room) MD5_CTX);
}

void lutil_MD5Update(lutil_MD5Context* context, const unsigned char* data, std::size_t length)
{
    if (length != 0)
        MD5Update(context_of(context), data, length);
}

void lutil_MD5Final(unsigned char digest[16], lutil_MD5Context* context)
{
    MD5Final(digest, context_of(context));
}

}  // extern "C"
