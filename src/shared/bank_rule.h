// The rule that generates the filter banks. Used by tools/lorvex-banks to
// write banks_data.cpp and by the test that checks the committed tables.
#pragma once

#include <cstdint>
#include <vector>

#include "shared/banks.h"

namespace lorvex {

// The continuous filter function of a bank, K(u), zero at |u| >= reach.
double bank_function(BankId id, double u);
double bank_reach(BankId id);

// One phase: taps of scale s (in 1/16) at phase p (0..15), by the rule.
void bank_phase(BankId id, int scale, int phase, int16_t taps[16]);

// All rows of one bank, row r serving scale r + 16: rows * 16 * 16 taps.
std::vector<int16_t> generate_bank(BankId id);

}  // namespace lorvex
