// Source position, shared by types, symbols, statements and the I-file.
#pragma once

struct PSN {
    const char* file; // borrowed from the file-name table; null means that the name is unknown
    long line;
    long column;
};
