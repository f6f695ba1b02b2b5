/* Arguments beyond the named ones lie in memory behind the last named one, in order, each at its type's alignment. */
#ifndef _STDARG_H
#define _STDARG_H

typedef char *va_list;

#define __va_unit(type) ((unsigned long)&((struct { char first; type second; } *)0)->second)
#define __va_round(list, type) ((list) = (va_list)(((unsigned long)(list) + __va_unit(type) - 1) & -__va_unit(type)))

#define va_start(list, last) ((void)__builtin_va_start(list, last))
#define va_arg(list, type) (*(type *)((__va_round(list, type), (list) += sizeof(type)) - sizeof(type)))
#define va_copy(to, from) ((void)((to) = (from)))
#define va_end(list) ((void)0)

#endif
