// Copies of whole structures, taken apart.
#pragma once

#include <vector>

class NODE;

// Whether a place stays where it is while a structure is copied to it or from it piece by piece: `*s.next` moves with
// the first piece of `s` that is written.
bool is_steady_place(const NODE* t);
// The copy as assignments of its scalars and bit-fields, in order; the caller owns what is appended. `to` and `from` are
// borrowed steady places of one structure type.
void copy_by_members(const NODE* to, const NODE* from, std::vector<NODE*>* copies);
