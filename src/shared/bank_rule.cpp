// The rule of the filter banks.
//
// For the row of scale s (in 1/16), phase p (0..15) and tap k (0..15), with
// S = s / 16 and t = (k - 7) - p / 16, the exact tap is
//
//     e(k) = 16384 * K(t / S) / sum over the 16 taps of K(t / S).
//
// Each phase is normalised by itself so a constant input keeps its value at
// every phase, and the filter is stretched by S so its cut-off falls with the
// rate. Rounding keeps that sum exact (largest remainders): every tap starts
// at floor(e), and the 16384 - sum(floor(e)) units still missing go one each
// to the taps with the largest fractional parts, an equal fraction going to
// the tap of larger offset first. Every tap is then within 1 of e, and a phase
// whose exact taps are symmetric comes out symmetric but for the tie units,
// which land on the side of positive offsets. All arithmetic is in double.
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

void bank_phase(BankId id, int scale, int phase, int16_t taps[16]) {
    const double stretch = scale / 16.0;
    double k_of_t[kBankTaps];
    double sum = 0.0;
    for (int k = 0; k < kBankTaps; ++k) {
        const double t = (k - 7) - phase / 16.0;
        k_of_t[k] = bank_function(id, t / stretch);
        sum += k_of_t[k];
    }

    double fraction[kBankTaps];
    int order[kBankTaps];
    int total = 0;
    for (int k = 0; k < kBankTaps; ++k) {
        const double exact = 16384.0 * k_of_t[k] / sum;
        const double whole = std::floor(exact);
        fraction[k] = exact - whole;
        taps[k] = static_cast<int16_t>(whole);
        total += taps[k];
        order[k] = k;
    }
    // Largest fraction first; of equal fractions, the larger offset first.
    std::sort(order, order + kBankTaps, [&](int a, int b) {
        return fraction[a] != fraction[b] ? fraction[a] > fraction[b] : a > b;
    });
    for (int i = 0; i < 16384 - total; ++i) ++taps[order[i]];
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
