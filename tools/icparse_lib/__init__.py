"""C99 to I-file for the Zelkova controllers: a parser that serves tests, benchmarks and demonstrations."""
