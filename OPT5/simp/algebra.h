// Rules for integer operators, one function a family. Each owns the node, whose operands are simplified, and returns
// what stands for it.
#pragma once

#include "OPT5/ir/node.h"

struct LOOP;

// What the known bits decide: a constant, or the tree. Asked for operators that combine bits.
NODE* simp_by_known_bits(NODE* t);
NODE* simp_PLUS(NODE* t);
NODE* simp_MINUS(NODE* t);
NODE* simp_MULT(NODE* t);
NODE* simp_DIV(NODE* t);
NODE* simp_MOD(NODE* t);
NODE* simp_shift(NODE* t);
NODE* simp_bitop(NODE* t);                   // ANDB, ORB, XORB
NODE* simp_unary(NODE* t);                   // UMINUS, NOTB
NODE* simp_relop(NODE* t);                   // integer and pointer compares
NODE* simp_arms(NODE* t, struct LOOP* loop); // QUEST
NODE* simp_cast_of_cast(NODE* t);            // SCONV
