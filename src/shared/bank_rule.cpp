// The rule of the filter banks.
//
// For the row of scale s (in 1/16), phase p (0..15) and tap k (0..15), with
// S = s / 16 and t = (k - 7) - p / 16, the exact tap is
//
//     e(k) = 16384 * K(t / S) / sum of K(t / S) over the filter's support.
//
// Each phase is normalised by itself so a constant input keeps its value at
// every phase, and the filter is stretched by S so its cut-off falls with the
// rate. The taps of a phase add up to the integer part of the sum of their
// exact values: 16384 everywhere but at the one phase whose support reaches
// past the stored taps.
//
// Rounding. LINEAR and SOFT have no negative lobes; their phases are rounded
// by largest remainders, every tap within 1 of e. The functions with negative
// lobes round their taps from left to right with the error carried, and the
// outer stretch of the phase (its side lobes on the side of positive offsets
// and the last tap of the main lobe) takes the remainder in proportion to its
// taps. The phases whose stretch nearly cancels are the ones that move far
// from e; the rest stay within about 1. All arithmetic is in double.
#include "shared/bank_rule.h"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace lorvex {

namespace {

// sin(pi u) / (pi u), exactly 0 at the non-zero integers (where sin(pi u)
// would leave a residue of the order of 1e-16).
double sinc(double u) {
    if (u == 0.0) return 1.0;
    if (u == std::round(u)) return 0.0;
    const double x = std::numbers::pi * u;
    return std::sin(x) / x;
}

// Keys cubic convolution with a = -1, v = |u|.
double keys(double v) {
    constexpr double a = -1.0;
    if (v < 1.0) return ((a + 2.0) * v - (a + 3.0)) * v * v + 1.0;
    return ((a * v - 5.0 * a) * v + 8.0 * a) * v - 4.0 * a;
}

}  // namespace

double bank_reach(BankId id) {
    switch (id) {
    case BANK_ID_LINEAR:
    case BANK_ID_SOFT: return 1.0;
    case BANK_ID_LANCZOS2:
    case BANK_ID_CUBIC: return 2.0;
    case BANK_ID_LANCZOS3: return 3.0;
    case BANK_ID_LANCZOS4: return 4.0;
    }
    return 0.0;
}

double bank_function(BankId id, double u) {
    const double v = std::fabs(u);
    const double reach = bank_reach(id);
    if (v >= reach) return 0.0;
    switch (id) {
    case BANK_ID_LINEAR: return 1.0 - v;
    case BANK_ID_CUBIC: return keys(v);
    case BANK_ID_SOFT:
    case BANK_ID_LANCZOS2:
    case BANK_ID_LANCZOS3:
    case BANK_ID_LANCZOS4: return sinc(v) * sinc(v / reach);
    }
    return 0.0;
}

namespace {

// Round half up, the same way for both signs.
double round_half_up(double x) { return std::floor(x + 0.5); }

// Largest remainders: every tap starts at floor(e), and the units still
// missing to `total` go one each to the largest fractional parts, of equal
// fractions the larger offset first. Every tap ends within 1 of e.
void round_largest_remainders(const double exact[kBankTaps], int total, int16_t taps[kBankTaps]) {
    double fraction[kBankTaps];
    int order[kBankTaps];
    for (int k = 0; k < kBankTaps; ++k) {
        const double whole = std::floor(exact[k]);
        fraction[k] = exact[k] - whole;
        taps[k] = static_cast<int16_t>(whole);
        total -= taps[k];
        order[k] = k;
    }
    std::sort(order, order + kBankTaps, [&](int a, int b) {
        return fraction[a] != fraction[b] ? fraction[a] > fraction[b] : a > b;
    });
    for (int i = 0; i < total; ++i) ++taps[order[i]];
}

}  // namespace

void bank_phase(BankId id, int scale, int phase, int16_t taps[16]) {
    // The filter's support may reach one sample beyond tap 0 (offset -8, only
    // at phase 0 of LANCZOS3's widest row): the normalising sum includes it,
    // but it is not stored, so that phase's stored taps fall short of 16384.
    const double stretch = scale / 16.0;
    double k_of_t[kBankTaps];
    double sum = bank_function(id, (-8 - phase / 16.0) / stretch);
    const double dropped = sum;
    for (int k = 0; k < kBankTaps; ++k) {
        k_of_t[k] = bank_function(id, ((k - 7) - phase / 16.0) / stretch);
        sum += k_of_t[k];
    }
    double exact[kBankTaps];
    for (int k = 0; k < kBankTaps; ++k) exact[k] = 16384.0 * k_of_t[k] / sum;
    // The stored taps add up to the integer part of their exact sum.
    const int total = static_cast<int>(std::floor(16384.0 * (sum - dropped) / sum));

    if (id == BANK_ID_LINEAR || id == BANK_ID_SOFT) {
        round_largest_remainders(exact, total, taps);
        return;
    }

    // Functions with negative lobes. The outer stretch runs from the last tap
    // of the main lobe (|u| < 1, u = t / S) to the last non-zero tap: the
    // side lobes on the side of positive offsets and one tap before them.
    int last = kBankTaps - 1;
    while (last > 0 && k_of_t[last] == 0.0) --last;
    int first = 0;
    for (int k = 0; k < kBankTaps; ++k)
        if ((k - 7) - phase / 16.0 < stretch) first = k;
    first = std::min(first, last);

    // Taps before the stretch: rounded from left to right, each taking the
    // rounding error of the taps before it, an error that a zero tap (an
    // exact zero of the function) drops.
    double carry = 0.0;
    int outside = 0;
    for (int k = 0; k < first; ++k) {
        if (k_of_t[k] == 0.0) {
            taps[k] = 0;
            carry = 0.0;
            continue;
        }
        const double value = exact[k] + carry;
        taps[k] = static_cast<int16_t>(round_half_up(value));
        carry = value - taps[k];
        outside += taps[k];
    }
    // The stretch takes the remainder in proportion to its exact taps: they
    // are scaled to add up to what the phase still needs, then rounded with
    // the error carried. Where the stretch's taps nearly cancel, the scale
    // factor is far from 1 and moves them noticeably.
    double stretch_sum = 0.0;
    for (int k = first; k <= last; ++k) stretch_sum += exact[k];
    const int remainder = total - outside;
    const double factor = stretch_sum != 0.0 ? remainder / stretch_sum : 1.0;
    carry = 0.0;
    for (int k = first; k < kBankTaps; ++k) {
        if (k > last) {
            taps[k] = 0;
            continue;
        }
        const double value = exact[k] * factor + carry;
        taps[k] = static_cast<int16_t>(round_half_up(value));
        carry = value - taps[k];
    }
}

std::vector<int16_t> generate_bank(BankId id) {
    const int rows = kBankRows[id];
    std::vector<int16_t> bank(static_cast<size_t>(rows) * kBankPhases * kBankTaps);
    for (int row = 0; row < rows; ++row)
        for (int phase = 0; phase < kBankPhases; ++phase)
            bank_phase(id, row + 16, phase,
                       &bank[(static_cast<size_t>(row) * kBankPhases + phase) * kBankTaps]);
    return bank;
}

}  // namespace lorvex
