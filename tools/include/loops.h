/* What a program may say of the loop that follows. Each macro is the pragma of its name.

   MUST_ITERATE(min, max, multiple)  the loop iterates at least `min` times, at most `max` times, a multiple of
       `multiple` times, whenever it is reached; a number may be left out. A minimum of 0 that is written down stays 0:
       MUST_ITERATE(0, , 4) allows 0, 4, 8, ... iterations. A multiple without a minimum is read as a promise that the
       loop iterates, so write the 0 where it may not. A maximum of 0 is none.
   PROB_ITERATE(min, max)            the same as a guess, on which nothing may rest.
   UNROLL(n)                         the loop is to be unrolled n times; 1: not at all.

   A promise that does not hold makes the program undefined; icrun --check finds it. */
#ifndef _LOOPS_H
#define _LOOPS_H

#define _LOOP_PRAGMA(text) _Pragma(#text)
#define MUST_ITERATE(...) _LOOP_PRAGMA(MUST_ITERATE(__VA_ARGS__))
#define PROB_ITERATE(...) _LOOP_PRAGMA(PROB_ITERATE(__VA_ARGS__))
#define UNROLL(n) _LOOP_PRAGMA(UNROLL(n))

#endif
