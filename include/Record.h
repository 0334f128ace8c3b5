// Layout helpers shared by every record header of the DVB service interface.
//
// Records are plain little-endian structures exchanged with the DVB service library by
// address. Their sizes and field offsets are a binary interface and must be the same on a
// 32-bit device build and on a 64-bit host, so each one is pinned at compile time.
#pragma once

#include <cstddef>
#include <cstdint>

#define DVB_RECORD_SIZE(Record, bytes) \
    static_assert(sizeof(Record) == (bytes), #Record " must be " #bytes " bytes")

#define DVB_RECORD_FIELD(Record, field, offset) \
    static_assert(offsetof(Record, field) == (offset), #Record "." #field " must sit at " #offset)

static_assert(sizeof(void*) == 4 || sizeof(void*) == 8, "unsupported pointer width");
static_assert(static_cast<uint16_t>(0x0102) == 0x0102 && __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__,
              "records are little-endian");
