#undef assert
#ifdef NDEBUG
#define assert(condition) ((void)0)
#else
void abort(void);
#define assert(condition) ((condition) ? (void)0 : abort())
#endif
