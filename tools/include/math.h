/* Each function for double, float (suffix f) and long double (suffix l). */
#ifndef _MATH_H
#define _MATH_H

#define M_PI 3.14159265358979323846
#define M_E 2.7182818284590452354
#define M_SQRT2 1.41421356237309504880

double sin(double x);
double cos(double x);
double tan(double x);
double asin(double x);
double acos(double x);
double atan(double x);
double sinh(double x);
double cosh(double x);
double tanh(double x);
double exp(double x);
double exp2(double x);
double expm1(double x);
double log(double x);
double log2(double x);
double log10(double x);
double log1p(double x);
double sqrt(double x);
double cbrt(double x);
double fabs(double x);
double floor(double x);
double ceil(double x);
double trunc(double x);
double round(double x);
double rint(double x);
double pow(double x, double y);
double fmod(double x, double y);
double atan2(double x, double y);
double hypot(double x, double y);
double fmin(double x, double y);
double fmax(double x, double y);
double copysign(double x, double y);
double fdim(double x, double y);
double ldexp(double x, int exponent);
double frexp(double x, int *exponent);
double modf(double x, double *whole);
double fma(double x, double y, double z);

float sinf(float x);
float cosf(float x);
float tanf(float x);
float asinf(float x);
float acosf(float x);
float atanf(float x);
float sinhf(float x);
float coshf(float x);
float tanhf(float x);
float expf(float x);
float exp2f(float x);
float expm1f(float x);
float logf(float x);
float log2f(float x);
float log10f(float x);
float log1pf(float x);
float sqrtf(float x);
float cbrtf(float x);
float fabsf(float x);
float floorf(float x);
float ceilf(float x);
float truncf(float x);
float roundf(float x);
float rintf(float x);
float powf(float x, float y);
float fmodf(float x, float y);
float atan2f(float x, float y);
float hypotf(float x, float y);
float fminf(float x, float y);
float fmaxf(float x, float y);
float copysignf(float x, float y);
float fdimf(float x, float y);
float ldexpf(float x, int exponent);
float frexpf(float x, int *exponent);
float modff(float x, float *whole);
float fmaf(float x, float y, float z);

long double sinl(long double x);
long double cosl(long double x);
long double tanl(long double x);
long double asinl(long double x);
long double acosl(long double x);
long double atanl(long double x);
long double sinhl(long double x);
long double coshl(long double x);
long double tanhl(long double x);
long double expl(long double x);
long double exp2l(long double x);
long double expm1l(long double x);
long double logl(long double x);
long double log2l(long double x);
long double log10l(long double x);
long double log1pl(long double x);
long double sqrtl(long double x);
long double cbrtl(long double x);
long double fabsl(long double x);
long double floorl(long double x);
long double ceill(long double x);
long double truncl(long double x);
long double roundl(long double x);
long double rintl(long double x);
long double powl(long double x, long double y);
long double fmodl(long double x, long double y);
long double atan2l(long double x, long double y);
long double hypotl(long double x, long double y);
long double fminl(long double x, long double y);
long double fmaxl(long double x, long double y);
long double copysignl(long double x, long double y);
long double fdiml(long double x, long double y);
long double ldexpl(long double x, int exponent);
long double frexpl(long double x, int *exponent);
long double modfl(long double x, long double *whole);
long double fmal(long double x, long double y, long double z);

#define isnan(x) ((x) != (x))

#endif
