#include <zrun.h>

extern int never_written, written_there;
extern const int table[4];
long negated(long v);
void write_there(int v);
int call_back(int (*f)(int, int));
int other_hidden(void);
void set_handler(int* where);
int deep(int n);
int sum_table(void);
