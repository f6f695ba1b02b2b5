// BITVEC: a growable bit vector on 32-bit words. PBSET: a sparse set of small integers that clears in constant time.
#pragma once

#include <cstdint>
#include <cstdio>
#include <iosfwd>

class BITVEC {
public:
    uint32_t bits = 0;
    uint32_t words = 0;    // (bits + 31) >> 5
    uint32_t capacity = 0; // allocated words
    uint64_t shared = 0;   // non-zero if the data isn't owned
    uint32_t* data = nullptr;

    BITVEC() = default;
    explicit BITVEC(uint32_t n); // all clear
    BITVEC(const BITVEC& other);
    BITVEC& operator=(const BITVEC& other);
    ~BITVEC();

    bool test(uint32_t i) const { return i < bits && (data[i >> 5] >> (i & 31) & 1); }
    void set(uint32_t i) { data[i >> 5] |= 1u << (i & 31); } // i below `bits`
    void clear(uint32_t i) {
        if (i < bits) data[i >> 5] &= ~(1u << (i & 31));
    }
    void set_all();
    void clear_all();
    bool empty() const;
    uint32_t count() const;
    uint32_t next_set(uint32_t from) const; // first set bit at or behind `from`, `bits` if none
    bool operator==(const BITVEC& other) const;
    bool operator!=(const BITVEC& other) const { return !(*this == other); }
    BITVEC& operator|=(const BITVEC& other); // bits beyond this vector's size are left out
    BITVEC& operator&=(const BITVEC& other); // bits beyond the other's size are cleared
    BITVEC& operator-=(const BITVEC& other);
};

// Keeps the bits in the old size. New bits are 0 within the capacity and 1 after a reallocation.
void bv_resize(BITVEC& v, uint32_t n);
void bv_copy_seg(BITVEC& to, const BITVEC& from, uint32_t lo, uint32_t hi);
void bv_diff(BITVEC& to, const BITVEC& a, const BITVEC& b); // a & ~b
void bv_print(const BITVEC& v);                             // "[1-3,7]" on standard output
void bv_dump(const BITVEC& v, FILE* out);
void bv_warn(const char* text);
std::ostream& operator<<(std::ostream& out, const BITVEC& v);

// Source: P. Briggs, L. Torczon, "An Efficient Representation for Sparse Sets", 1993. Elements 0 to 65535.
struct PBSET {
    uint32_t count;
    uint32_t dense_capacity;
    uint32_t max_element; // largest that `sparse` can hold
    uint16_t* sparse;     // element to position
    uint16_t* dense;      // position to element
};

PBSET* make_PBSET(int universe, int capacity);
bool element_is_in_PBSET(int e, const PBSET* set);
void add_element_to_PBSET(int e, PBSET* set); // ignores elements out of range
void remove_element_from_PBSET(int e, PBSET* set);
void make_PBSET_empty(PBSET* set);
bool another_element_in_PBSET(uint32_t i, const PBSET* set);
int next_element_in_PBSET(uint32_t i, const PBSET* set);
void extend_PBSET(PBSET* set, int universe);
void erase_PBSET(PBSET* set);
void dump_PBSET(const PBSET* set, FILE* out);
