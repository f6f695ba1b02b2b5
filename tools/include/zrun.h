/* What the executor prints, one line each. */
#ifndef _ZRUN_H
#define _ZRUN_H

void put_i16(int value);
void put_i32(long value);
void put_u32(unsigned long value);
void put_i64(long long value);
void put_f32(float value);
void put_f64(long double value);
void put_str(const char *text);

/* Exceptions. Between __eh_catch(K, handler) or __eh_cleanup(f(x)) or __eh_terminate() and __eh_end(), what zthrow(K)
   throws out of a call goes to the label, calls f(x) and goes on, or ends the program. K may be "...", for any. In
   the handler zcaught() tells what came. __eh_pass() begins a region in which exceptions are known to leave calls. */
void zthrow(int what);
int zcaught(void);

#endif
