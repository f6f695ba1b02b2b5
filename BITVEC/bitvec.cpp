// BITVEC. Bits beyond `bits` in the last word are zero before and after every operation, so that words can be compared
// and counted whole.

#include "BITVEC/bitvec.h"

#include <algorithm>
#include <cstring>
#include <ostream>
#include <string>

namespace {

uint32_t words_for(uint32_t n) { return static_cast<uint32_t>((static_cast<uint64_t>(n) + 31) >> 5); }

// The ones of the last word's used bits.
uint32_t tail_mask(uint32_t n) { return n & 31 ? (1u << (n & 31)) - 1 : ~0u; }

void mask_tail(BITVEC& v) {
    if (v.words) v.data[v.words - 1] &= tail_mask(v.bits);
}

void release(BITVEC& v) {
    if (v.shared)
        bv_warn("shared data isn't freed");
    else
        delete[] v.data;
}

void set_size(BITVEC& v, uint32_t n) {
    v.bits = n;
    v.words = words_for(n);
}

std::string bv_text(const BITVEC& v) {
    std::string text = "[";
    for (uint32_t i = v.next_set(0); i < v.bits; i = v.next_set(i)) {
        uint32_t last = i;
        while (v.test(last + 1)) ++last;
        if (text.size() > 1) text += ',';
        text += std::to_string(i);
        if (last > i) text += '-' + std::to_string(last);
        i = last + 1;
    }
    return text + ']';
}

} // namespace

BITVEC::BITVEC(uint32_t n)
    : bits(n), words(words_for(n)), capacity(words), data(words ? new uint32_t[words]() : nullptr) {}

BITVEC::BITVEC(const BITVEC& other) : BITVEC(other.bits) {
    if (words) memcpy(data, other.data, words * sizeof *data);
}

BITVEC& BITVEC::operator=(const BITVEC& other) {
    if (this == &other) return *this;
    if (capacity < other.words)
        bv_resize(*this, other.bits);
    else
        set_size(*this, other.bits);
    if (words) memcpy(data, other.data, words * sizeof *data);
    return *this;
}

BITVEC::~BITVEC() { release(*this); }

void BITVEC::set_all() {
    if (!words) return;
    memset(data, 0xFF, words * sizeof *data);
    mask_tail(*this);
}

void BITVEC::clear_all() {
    if (words) memset(data, 0, words * sizeof *data);
}

bool BITVEC::empty() const {
    return std::all_of(data, data + words, [](uint32_t w) { return w == 0; });
}

uint32_t BITVEC::count() const {
    uint32_t n = 0;
    for (uint32_t i = 0; i < words; ++i) n += static_cast<uint32_t>(__builtin_popcount(data[i]));
    return n;
}

uint32_t BITVEC::next_set(uint32_t from) const {
    if (from >= bits) return bits;
    uint32_t i = from >> 5;
    uint32_t w = data[i] & (~0u << (from & 31));
    while (!w) {
        if (++i == words) return bits;
        w = data[i];
    }
    return (i << 5) + static_cast<uint32_t>(__builtin_ctz(w));
}

bool BITVEC::operator==(const BITVEC& other) const {
    return bits == other.bits && std::equal(data, data + words, other.data);
}

BITVEC& BITVEC::operator|=(const BITVEC& other) {
    for (uint32_t i = 0, n = std::min(words, other.words); i < n; ++i) data[i] |= other.data[i];
    mask_tail(*this);
    return *this;
}

BITVEC& BITVEC::operator&=(const BITVEC& other) {
    for (uint32_t i = 0; i < words; ++i) data[i] &= i < other.words ? other.data[i] : 0;
    return *this;
}

BITVEC& BITVEC::operator-=(const BITVEC& other) {
    for (uint32_t i = 0, n = std::min(words, other.words); i < n; ++i) data[i] &= ~other.data[i];
    return *this;
}

void bv_resize(BITVEC& v, uint32_t n) {
    uint32_t old_bits = v.bits, old_words = v.words, new_words = words_for(n);
    if (new_words > v.capacity) {
        uint32_t* data = new uint32_t[new_words];
        memset(data, 0xFF, new_words * sizeof *data);
        if (old_words) memcpy(data, v.data, old_words * sizeof *data);
        if (old_bits & 31) data[old_words - 1] |= ~tail_mask(old_bits);
        release(v);
        v.data = data;
        v.capacity = new_words;
        v.shared = 0;
    } else if (new_words > old_words) {
        memset(v.data + old_words, 0, (new_words - old_words) * sizeof *v.data);
    }
    set_size(v, n);
    mask_tail(v);
}

void bv_copy_seg(BITVEC& to, const BITVEC& from, uint32_t lo, uint32_t hi) {
    if (!from.bits) return;
    hi = std::min(hi, from.bits - 1);
    if (lo > hi) return;
    if (to.bits <= hi) {
        uint32_t old = to.bits;
        bv_resize(to, hi + 1);
        for (uint32_t i = old; i < lo; ++i) to.clear(i); // new bits outside the segment
    }
    for (uint32_t i = lo >> 5; i <= hi >> 5; ++i) {
        uint32_t mask = ~0u;
        if (i == lo >> 5) mask &= ~0u << (lo & 31);
        if (i == hi >> 5) mask &= tail_mask(hi + 1);
        to.data[i] = (to.data[i] & ~mask) | (from.data[i] & mask);
    }
}

void bv_diff(BITVEC& to, const BITVEC& a, const BITVEC& b) {
    if (&to == &b && &to != &a) {
        BITVEC copy(b);
        bv_diff(to, a, copy);
        return;
    }
    to = a;
    to -= b;
}

void bv_print(const BITVEC& v) {
    fputs(bv_text(v).c_str(), stdout);
    fflush(stdout);
}

void bv_dump(const BITVEC& v, FILE* out) { fprintf(out, "%u bits: %s\n", v.bits, bv_text(v).c_str()); }

std::ostream& operator<<(std::ostream& out, const BITVEC& v) { return out << bv_text(v); }

void bv_warn(const char*) {}
