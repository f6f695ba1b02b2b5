#ifndef _STDIO_H
#define _STDIO_H

#include <stdarg.h>
#include <stddef.h>

#define EOF (-1)

int printf(const char *format, ...);
int sprintf(char *to, const char *format, ...);
int snprintf(char *to, size_t size, const char *format, ...);
int vprintf(const char *format, va_list arguments);
int vsprintf(char *to, const char *format, va_list arguments);
int vsnprintf(char *to, size_t size, const char *format, va_list arguments);
int puts(const char *s);
int putchar(int c);
int getchar(void);

#endif
