// Filter banks: one filter function pre-sampled for every scale it serves and
// for 16 sub-pixel phases. A row is 16 phases of 16 taps (i16, 16384 = 1.0),
// 512 bytes; the row for scale s (source/destination in 1/16) is row s - 16.
// Tap k of a phase stands at offset k - 7 from the sample at the integer part
// of the position, so tap 7 is that sample and tap 8 the next one.
//
// The tables are constant data written by tools/lorvex-banks from the rule in
// bank_rule.cpp; a test regenerates them and compares.
#pragma once

#include <cstdint>

namespace lorvex {

constexpr int kBankPhases = 16;
constexpr int kBankTaps = 16;

using BankPhase = int16_t[kBankTaps];
using BankRow = BankPhase[kBankPhases];

// Rows are aligned so a kernel loads the 16 taps of a phase in aligned reads.
alignas(64) extern const int16_t BANK_LINEAR[113][16][16];   // scales 16..128
alignas(64) extern const int16_t BANK_SOFT[113][16][16];     // scales 16..128
alignas(64) extern const int16_t BANK_LANCZOS2[49][16][16];  // scales 16..64
alignas(64) extern const int16_t BANK_CUBIC[49][16][16];     // scales 16..64
alignas(64) extern const int16_t BANK_LANCZOS3[28][16][16];  // scales 16..43
alignas(64) extern const int16_t BANK_LANCZOS4[1][16][16];   // scale 16

enum BankId : int {
    BANK_ID_LINEAR = 0,
    BANK_ID_SOFT = 1,
    BANK_ID_LANCZOS2 = 2,
    BANK_ID_CUBIC = 3,
    BANK_ID_LANCZOS3 = 4,
    BANK_ID_LANCZOS4 = 5,
};
constexpr int kBankCount = 6;

// Number of rows of each bank, indexed by BankId.
constexpr int kBankRows[kBankCount] = {113, 113, 49, 49, 28, 1};

// First phase of row `row` of bank `id` (16 phases of 16 taps follow).
const int16_t* bank_row(BankId id, int row);

}  // namespace lorvex
