/* Complex numbers of double, and of float (suffix f). There are none of long double. */
#ifndef _COMPLEX_H
#define _COMPLEX_H

#include <math.h>

#define complex _Complex
#define _Complex_I __builtin_complex(0.0f, 1.0f)
#define I _Complex_I

#define CMPLX(re, im) __builtin_complex((double)(re), (double)(im))
#define CMPLXF(re, im) __builtin_complex((float)(re), (float)(im))

#define _COMPLEX_FUNCTIONS(REAL, SUFFIX)                                                                            \
    static inline REAL creal##SUFFIX(REAL _Complex z) { return __builtin_real(z); }                                 \
    static inline REAL cimag##SUFFIX(REAL _Complex z) { return __builtin_imag(z); }                                 \
    static inline REAL _Complex conj##SUFFIX(REAL _Complex z)                                                       \
    { return __builtin_complex(__builtin_real(z), -__builtin_imag(z)); }                                            \
    static inline REAL cabs##SUFFIX(REAL _Complex z)                                                                \
    { return sqrt##SUFFIX(__builtin_real(z) * __builtin_real(z) + __builtin_imag(z) * __builtin_imag(z)); }         \
    static inline REAL carg##SUFFIX(REAL _Complex z) { return atan2##SUFFIX(__builtin_imag(z), __builtin_real(z)); }

_COMPLEX_FUNCTIONS(float, f)
_COMPLEX_FUNCTIONS(double, )

#endif
