// Vector kernels of the Base64 coder. Each works on whole blocks only and
// returns how much input it consumed; the caller finishes with the table-driven
// loops. Call a kernel only when zv::cpu::has() reports its feature.
#pragma once

#include <cstddef>
#include <cstdint>

#include "internal.h"

namespace zv::base64 {

// The 64 characters of the text, in value order.
inline constexpr char kAlphabet[] =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// Encodes whole 12-byte (SSSE3) or 24-byte (AVX2) blocks of the |n| bytes at
// |in|, 16 characters per 12 bytes, and returns the bytes consumed (a multiple
// of 12; 0 below 16 bytes). The AVX-512 VBMI kernel (64-bit only) takes
// every whole 3-byte group.
ZV_INTERNAL size_t encode_ssse3(const uint8_t *in, size_t n, char *out);
ZV_INTERNAL size_t encode_avx2(const uint8_t *in, size_t n, char *out);
ZV_INTERNAL size_t encode_avx512vbmi(const uint8_t *in, size_t n, char *out);

// Decodes blocks of 16 (SSSE3), 32 (AVX2) or 64 (AVX-512 VBMI, 64-bit only)
// alphabet characters into 12, 24 or 48 bytes, stopping at the first block
// that holds any other character or when fewer characters remain. Each store
// writes a whole vector, so |room|, the bytes that may be written at |out|,
// bounds the blocks too. The AVX-512 VBMI kernel then takes, under masks, the
// whole quads of alphabet characters that follow and fit |room|. Returns the
// characters consumed (a multiple of 16, of 4 for AVX-512 VBMI); the bytes
// written are 3/4 of it.
ZV_INTERNAL size_t decode_ssse3(const unsigned char *in, size_t n, uint8_t *out, size_t room);
ZV_INTERNAL size_t decode_avx2(const unsigned char *in, size_t n, uint8_t *out, size_t room);
ZV_INTERNAL size_t decode_avx512vbmi(const unsigned char *in, size_t n, uint8_t *out, size_t room);

}  // namespace zv::base64
