// Syntax codes: how a value is held and compared. Every attribute carries one; see also RFC 4517.
#pragma once

// The bits. A value whose code has one of the two lowest is held as text.
constexpr unsigned SC_CIS = 0x001;             // text, compared without regard to case
constexpr unsigned SC_CES = 0x002;             // text, compared exactly
constexpr unsigned SC_BIN = 0x004;             // bytes
constexpr unsigned SC_TEL = 0x008;             // number to dial; with SC_CIS
constexpr unsigned SC_DN = 0x010;              // distinguished name; with SC_CIS
constexpr unsigned SC_INT = 0x020;             // integer
constexpr unsigned SC_BOOL = 0x040;            // boolean
constexpr unsigned SC_GT = 0x080;              // generalized time
constexpr unsigned SC_UTCT = 0x100;            // UTC time
constexpr unsigned SC_BIT_STRING = 0x200;      // with SC_CIS
constexpr unsigned SC_NUMERIC_STRING = 0x400;  // with SC_CIS
constexpr unsigned SC_COUNTRY_STRING = 0x800;  // with SC_CIS
