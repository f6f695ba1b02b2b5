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

#endif
