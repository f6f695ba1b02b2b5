/* Common types. Sizes and pointer differences are counted in 16-bit units. */
#ifndef _STDDEF_H
#define _STDDEF_H

typedef unsigned long size_t;
typedef long ptrdiff_t;
#ifndef _WCHAR_T
#define _WCHAR_T
typedef __wchar_t wchar_t;
#endif

#define NULL ((void *)0)
#define offsetof(type, member) ((size_t)&((type *)0)->member)

#endif
