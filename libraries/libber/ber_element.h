// BER elements: values are written by ber_printf and read by ber_scanf, both driven by a format of one letter a value.
//
// The encoding is what LDAP uses of BER (RFC 4511 section 5.1, X.690): definite lengths and tags of one byte. What is
// written is DER wherever BER leaves a choice: shortest lengths, shortest integers, 0xFF for true. What is read may be
// any BER of that kind; indefinite lengths, tags of several bytes, lengths beyond what is left, and strings in pieces
// are refused.
//
// An element either writes (ber_alloc, ber_alloc_t, fber_alloc) or reads (ber_init, ber_init2, fber_init2); the calls
// of the other kind fail on it. It is used by one thread at a time; different elements have nothing in common. Nothing
// here throws or logs, and no allocation failure and no input ends in more than an error result; a null element, format
// or place for a result is an error, too, but no letter of a format takes a null place. A call that memory ran out in
// leaves errno at ENOMEM, and other failures leave errno as it was. All memory that changes hands is of malloc.
#pragma once

#include <stddef.h>
#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

// One byte, class and form included. As wide as int, so that a plain number may stand where a format has a "t".
typedef unsigned int ber_tag_t;
// Bytes.
typedef unsigned long ber_len_t;

// Results in place of a tag: nothing readable is there; and of ber_first_element and ber_next_element, there is no
// further element.
DIRBASE_CONSTANT(ber_tag_t, LBER_ERROR, 0xFFFFFFFFu);
DIRBASE_CONSTANT(ber_tag_t, LBER_DEFAULT, 0xFFFFFFFEu);

// Universal tags.
DIRBASE_NUMBER(ber_tag_t, LBER_BOOLEAN, 0x01);
DIRBASE_NUMBER(ber_tag_t, LBER_INTEGER, 0x02);
DIRBASE_NUMBER(ber_tag_t, LBER_OCTETSTRING, 0x04);
DIRBASE_NUMBER(ber_tag_t, LBER_NULL, 0x05);
DIRBASE_NUMBER(ber_tag_t, LBER_ENUMERATED, 0x0A);
DIRBASE_NUMBER(ber_tag_t, LBER_SEQUENCE, 0x30);
DIRBASE_NUMBER(ber_tag_t, LBER_SET, 0x31);

// How many sequences and sets may be open at once, in an element that writes or within one ber_scanf.
DIRBASE_NUMBER(unsigned, LBER_MAX_OPEN, 100);

// The positions are there to be read:
//
//   an element that writes   once every sequence is closed, the encoding is the ber_ptr - ber_buf bytes from ber_buf,
//                            the start of a block of malloc; both are null before the first write. ber_end is the
//                            block's end. The caller may take the block, and then says ber_free(ber, 0).
//   an element that reads    ber_ptr is the next byte to be read of those from ber_buf to ber_end. A caller that reads
//                            the members of a construction may draw ber_end in to the construction's end, and put it
//                            back afterwards: nothing is read beyond it.
typedef struct BerElement BerElement;
struct BerElement {
    uint8_t ber_options;  // for the caller to set; the encoding is the same whatever it says
    char* ber_buf;
    char* ber_ptr;
    char* ber_end;

    // The rest is the library's own.
    uint8_t ber_state;
    ber_tag_t ber_tag;                 // what the next value is tagged with, 0 for its own tag
    unsigned ber_open;                 // open sequences and sets
    size_t ber_starts[LBER_MAX_OPEN];  // where the contents of each begin
};

DIRBASE_C_BEGIN

// ---- making and releasing -------------------------------------------------------------------------------------------

// Makes an empty element that writes. Returns it for the caller to release with ber_free, or null without memory.
//
//   options  becomes its ber_options.
DIRBASE_EXPORT BerElement* ber_alloc(void);
DIRBASE_EXPORT BerElement* ber_alloc_t(int options);

// Makes the caller's record an element that reads a value.
//
//   value    its bytes are borrowed: they stay where they are, unchanged, as long as the element is read. An empty one
//            is legal.
//   options  becomes its ber_options.
//   ber      a record of any content, but none that ber_alloc, ber_alloc_t or ber_init made: that would be lost, as
//            ber_free no longer knew it for its own. ber_free may be called for the record and doesn't have to be.
//
// Returns 0, or -1 when an argument is null or the value has a length and no bytes; then the record reads nothing.
DIRBASE_EXPORT int ber_init2(const berval* value, int options, BerElement* ber);

// Makes an element that reads a copy of a value. Returns it for the caller to release with ber_free, or null without
// memory or for what ber_init2 refuses.
DIRBASE_EXPORT BerElement* ber_init(const berval* value);

// Releases an element; null does nothing. A record of the caller's own (ber_init2) stays, and what it reads too.
//
//   free_buffer  0: the block at ber_buf has been taken by the caller, and stays.
DIRBASE_EXPORT void ber_free(BerElement* ber, int free_buffer);

// ---- writing --------------------------------------------------------------------------------------------------------

// Writes what the format's letters name, behind what is there. What one call opens may be closed by another.
//
//   b        int                         BOOLEAN
//   i  e     int                         INTEGER, ENUMERATED
//   I        int64_t                     INTEGER
//   s        const char*                 OCTET STRING of a zero-terminated text
//   o        const char*, ber_len_t      OCTET STRING of so many bytes
//   O        const berval*               OCTET STRING
//   v        char* const*                an OCTET STRING for each text of a null-terminated array; null has none
//   V        berval* const*              the same of bervals
//   n                                    NULL
//   { }  [ ]                             opens a SEQUENCE, a SET; closes the one opened last, whichever it is
//   t        ber_tag_t                   the tag of the next value or construction in place of its own, as it stands;
//                                        all values of one v or V get it
//
// Texts and bytes are borrowed for the call. A berval without bv_val is written as the empty one, as ber_bvdup copies
// it.
//
// Returns 0, or -1: no memory, a null text or berval, null bytes with a length, a closing without an opening or behind
// a "t" that nothing followed, more than LBER_MAX_OPEN open, a tag that is 0 or not one whole byte (its low five bits
// all set), another letter, an element that reads. Once it has failed an element only fails; it is still to be
// released.
DIRBASE_EXPORT int ber_printf(BerElement* ber, const char* format, ...);
DIRBASE_EXPORT int ber_printf_w(BerElement* ber, const char* format, ...);  // the same; all texts are UTF-8 in both

// Copies what has been written.
//
//   value  receives the copy, for the caller to release with ber_bvfree; null on failure.
//
// Returns 0, or -1: no memory, something still open or failed, a "t" that nothing followed, a null argument, an element
// that reads.
DIRBASE_EXPORT int ber_flatten(const BerElement* ber, berval** value);

// ---- reading --------------------------------------------------------------------------------------------------------

// Reads values from the current position on into what the format's letters name.
//
//   b        int*                        0 or 1; any byte but 0 is true
//   i  e     int32_t*                    at most 4 bytes of INTEGER or ENUMERATED
//   I        int64_t*                    at most 8 bytes of them
//   a        char**                      a new zero-terminated text; a zero byte in it is a failure
//   A        char**                      the same, but null for the empty text
//   s        char*, ber_len_t*           bytes into a buffer of so many, with a zero behind them, and their number; it
//                                        is a failure when they don't fit
//   o        berval*                     new bytes, with a zero behind them
//   O        berval**                    a new berval, for ber_bvfree
//   m        berval*                     the bytes where they are: borrowed from what the element reads
//   v        char***                     all texts (as a) up to the end of the innermost construction, in a new
//                                        null-terminated array; null when there is none. The end is that of the whole
//                                        when this call has opened nothing: a sequence of texts is "{v}"
//   V        berval***                   the same of bervals, for ber_bvecfree
//   n                                    NULL
//   { }  [ ]                             enters a construction; leaves it, passing over what is unread in it. Both
//                                        enter SEQUENCE, SET and whatever has a tag that isn't universal, also one
//                                        of the primitive form, since some write constructions so: a caller to whom
//                                        that is a fault looks at the tag first
//   t        ber_tag_t*                  the tag of the next value, which stays to be read
//   T        ber_tag_t*                  the same, and the position moves behind the tag and the length
//   l        ber_len_t*                  the length of the next value, which stays to be read
//   x                                    passes over a value
//
// Within a construction that this call entered nothing is read beyond its end. One left open stays entered, and its
// closing in a later call moves nothing: it is for the caller to have read it all. Texts, numbers and so on are read
// under any primitive tag that isn't universal; a universal one has to be theirs. Numbers needn't be in the fewest
// bytes.
//
// Returns the tag read last (0 for a format that reads none), or LBER_ERROR: what is there isn't what the letter asks,
// no memory, more than LBER_MAX_OPEN open, a letter that isn't listed, an element that writes. After a failure the
// position is where it was before the call, what the call allocated is released, and all pointers that the format would
// have filled, up to a letter that isn't listed, are null; numbers and the buffer of an "s" may have been written.
DIRBASE_EXPORT ber_tag_t ber_scanf(BerElement* ber, const char* format, ...);
DIRBASE_EXPORT ber_tag_t ber_scanf_w(BerElement* ber, const char* format,
                                     ...);  // the same; all texts are UTF-8 in both

// Return the tag of the value at the position and set *len to its length, or LBER_ERROR. ber_peek_tag leaves the
// position alone, ber_skip_tag moves it to the first byte of the content, so that the members of a construction can be
// read. With either the content is all there.
DIRBASE_EXPORT ber_tag_t ber_peek_tag(const BerElement* ber, ber_len_t* len);
DIRBASE_EXPORT ber_tag_t ber_skip_tag(BerElement* ber, ber_len_t* len);

// Walk through a construction: ber_first_element enters it (what "{" enters), both return the tag of the member at the
// position and set *len to its length. The caller reads each member whole before asking for the next.
//
//   last  set by ber_first_element to the construction's end, handed to ber_next_element.
//
// LBER_DEFAULT is the end of the construction; *len stays as it was. LBER_ERROR: no construction is here
// (ber_first_element), or what is here isn't a member that ends within it; the position, *len and *last are as they
// were before the call.
//
//     char* last;
//     for (tag = ber_first_element(ber, &len, &last); tag != LBER_DEFAULT; tag = ber_next_element(ber, &len, last))
//         if (tag == LBER_ERROR || ber_scanf(ber, "a", &text) == LBER_ERROR) ...
DIRBASE_EXPORT ber_tag_t ber_first_element(BerElement* ber, ber_len_t* len, char** last);
DIRBASE_EXPORT ber_tag_t ber_next_element(BerElement* ber, ber_len_t* len, const char* last);

// ---- the second name of the family ----------------------------------------------------------------------------------

// Each does what its ber_ namesake does, on the same elements.
DIRBASE_EXPORT BerElement* fber_alloc(void);
DIRBASE_EXPORT int fber_init2(const berval* value, int options, BerElement* ber);
DIRBASE_EXPORT int fber_printf(BerElement* ber, const char* format, ...);
DIRBASE_EXPORT ber_tag_t fber_scanf(BerElement* ber, const char* format, ...);
DIRBASE_EXPORT void fber_free(BerElement* ber, int free_buffer);

// Reads a string, which may hold any bytes.
//
//   text  receives a new block with a zero behind the bytes, for the caller to free(); null on failure.
//   len   receives the number of bytes, without that zero; 0 on failure.
//
// Returns the tag, or LBER_ERROR as ber_scanf does and when one of the places is null, with the position unmoved.
DIRBASE_EXPORT ber_tag_t fber_get_string_len(BerElement* ber, char** text, ber_len_t* len);

DIRBASE_C_END
