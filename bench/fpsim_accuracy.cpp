// Measures the elementary functions of the floating-point simulator against MPFR.
//
//     fpsim_accuracy [points]
//
// For each function: how many of the points come out as another double than the correctly rounded one, the worst error
// of the simulator's own value in units of the double's last place, before it is rounded to the double, and the time a
// call.
#include "FPSIM/fpsim.h"

#include <chrono>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mpfr.h>

namespace {

class Random {
public:
    uint64_t next() {
        state_m ^= state_m << 13;
        state_m ^= state_m >> 7;
        state_m ^= state_m << 17;
        return state_m * 0x2545F4914F6CDD1Du;
    }
    // A double of either sign if `both`, its exponent from `low` up to below `high`.
    double number(int low, int high, bool both) {
        double m = 1 + ldexp(static_cast<double>(next() >> 12), -52);
        int e = low + static_cast<int>(next() % static_cast<unsigned>(high - low));
        return ldexp(both && next() & 1 ? -m : m, e);
    }

private:
    uint64_t state_m = 88172645463325252u;
};

using UNARY = int (*)(const simul_fval*, simul_fval*);
using BINARY = int (*)(const simul_fval*, const simul_fval*, simul_fval*);
using MPFR_UNARY = int (*)(mpfr_t, const mpfr_t, mpfr_rnd_t);
using MPFR_BINARY = int (*)(mpfr_t, const mpfr_t, const mpfr_t, mpfr_rnd_t);

struct ROW {
    const char* name;
    UNARY f;
    MPFR_UNARY reference;
    int low, high; // exponents of the argument
    bool both;
    BINARY f2 = nullptr;
    MPFR_BINARY reference2 = nullptr;
    int low2 = 0, high2 = 1;
};

const ROW rows[] = {
    {"sqrt", f_sqrt, mpfr_sqrt, -1022, 1024, false},
    {"exp", f_exp, mpfr_exp, -40, 10, true},
    {"log", f_log, mpfr_log, -1022, 1024, false},
    {"log near 1", f_log, mpfr_log, -1, 1, false},
    {"log10", f_log10, mpfr_log10, -1022, 1024, false},
    {"sin", f_sin, mpfr_sin, -30, 20, true},
    {"sin large", f_sin, mpfr_sin, 20, 1024, true},
    {"cos", f_cos, mpfr_cos, -30, 20, true},
    {"cos large", f_cos, mpfr_cos, 20, 1024, true},
    {"tan", f_tan, mpfr_tan, -30, 20, true},
    {"tan large", f_tan, mpfr_tan, 20, 1024, true},
    {"asin", f_asin, mpfr_asin, -30, 0, true},
    {"acos", f_acos, mpfr_acos, -30, 0, true},
    {"atan", f_atan, mpfr_atan, -30, 60, true},
    {"sinh", f_sinh, mpfr_sinh, -30, 10, true},
    {"cosh", f_cosh, mpfr_cosh, -30, 10, true},
    {"tanh", f_tanh, mpfr_tanh, -30, 6, true},
    {"pow", nullptr, nullptr, -10, 10, false, f_pow, mpfr_pow, -10, 7},
    {"pow near 1", nullptr, nullptr, -1, 1, false, f_pow, mpfr_pow, -10, 20},
    {"atan2", nullptr, nullptr, -40, 40, true, f_atan2, mpfr_atan2, -40, 40},
};

simul_fval sim(double v) {
    uint64_t b;
    memcpy(&b, &v, 8);
    simul_fval x;
    ieee_cvt_dtos(static_cast<uint32_t>(b >> 32), static_cast<uint32_t>(b), &x);
    return x;
}

// The simulator's value, exactly.
void set_from(mpfr_t out, const simul_fval* x) {
    mpfr_set_zero(out, 1);
    for (uint16_t digit : x->mant) {
        mpfr_mul_ui(out, out, 65536, MPFR_RNDN);
        mpfr_add_ui(out, out, digit, MPFR_RNDN);
    }
    mpfr_mul_2si(out, out, x->exp - 96, MPFR_RNDN);
    if (x->sign) mpfr_neg(out, out, MPFR_RNDN);
}

void measure(const ROW& row, long points) {
    mpfr_t a, b, want, got;
    mpfr_inits2(400, a, b, want, got, static_cast<mpfr_ptr>(nullptr));
    Random random;
    long wrong = 0;
    double worst = 0;
    std::chrono::nanoseconds spent{0};
    for (long i = 0; i < points; ++i) {
        double x = random.number(row.low, row.high, row.both), y = random.number(row.low2, row.high2, true);
        simul_fval sx = sim(x), sy = sim(y), r;
        auto start = std::chrono::steady_clock::now();
        if (row.f)
            row.f(&sx, &r);
        else
            row.f2(&sx, &sy, &r);
        spent += std::chrono::steady_clock::now() - start;
        mpfr_set_d(a, x, MPFR_RNDN);
        mpfr_set_d(b, y, MPFR_RNDN);
        if (row.f)
            row.reference(want, a, MPFR_RNDN);
        else
            row.reference2(want, a, b, MPFR_RNDN);
        double host = mpfr_get_d(want, MPFR_RNDN); // one rounding, subnormal results too
        uint64_t bits;
        memcpy(&bits, &host, 8);
        uint64_t mine = get_ieee_dbl_fmt(&r);
        if (mine != bits && !(std::isnan(host) && f_is_nan(&r))) {
            if (wrong++ < 3) printf("  %s(%a, %a): %016lx, should be %016lx\n", row.name, x, y, mine, bits);
        }
        if (!std::isfinite(host) || host == 0 || f_is_zero(&r) || r.exp == 32767) continue;
        set_from(got, &r);
        mpfr_sub(got, got, want, MPFR_RNDN);
        long e = mpfr_get_exp(want) < -1021 ? -1021 : mpfr_get_exp(want);
        mpfr_mul_2si(got, got, 53 - e, MPFR_RNDN);
        double error = fabs(mpfr_get_d(got, MPFR_RNDU));
        if (error > worst) worst = error;
    }
    printf("%-12s %ld points, %ld wrong, worst error %.3g ulp before rounding, %.0f ns a call\n", row.name, points,
           wrong, worst, static_cast<double>(spent.count()) / static_cast<double>(points));
    mpfr_clears(a, b, want, got, static_cast<mpfr_ptr>(nullptr));
}

} // namespace

int main(int argc, char** argv) {
    long points = argc > 1 ? atol(argv[1]) : 100000;
    for (const ROW& row : rows) measure(row, points);
    return 0;
}
