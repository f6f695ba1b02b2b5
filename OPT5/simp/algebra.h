// The handlers of the dispatch on the opcode, one a family. Each owns the node, whose operands are simplified, and
// returns what stands for it. `loop` may be null.
#pragma once

#include "OPT5/ir/node.h"

struct LOOP;

// ---- Arithmetic and bits
NODE* simp_by_known_bits(NODE* t); // a constant where every bit of the value is known, or the tree
// Puts in place of the tree at `link` one with the same bits where `mask` has ones; whether anything changed.
bool narrow_to_mask(NODE** link, uint64_t mask);
NODE* simp_PLUS(NODE* t, struct LOOP* loop);
NODE* simp_MINUS(NODE* t, struct LOOP* loop);
NODE* simp_MULT(NODE* t, struct LOOP* loop);
NODE* simp_DIV(NODE* t, struct LOOP* loop);
NODE* simp_MOD(NODE* t, struct LOOP* loop);
NODE* simp_shift(NODE* t, struct LOOP* loop); // SLL, SRL
NODE* simp_bitop(NODE* t, struct LOOP* loop); // ANDB, ORB, XORB
NODE* simp_unary(NODE* t, struct LOOP* loop); // UMINUS, NOTB
NODE* simp_ABS(NODE* t, struct LOOP* loop);
NODE* simp_SQR(NODE* t, struct LOOP* loop);

// ---- Floating point
NODE* simp_float_sum(NODE* t, struct LOOP* loop); // PLUS, MINUS
NODE* simp_float_relop(NODE* t, struct LOOP* loop);
NODE* simp_float_MULT(NODE* t, struct LOOP* loop);
NODE* simp_float_DIV(NODE* t, struct LOOP* loop);
NODE* simp_float_unary(NODE* t); // UMINUS
NODE* simp_RECIP(NODE* t, struct LOOP* loop);
// Of a cast to the short format, or null: computed there.
NODE* compute_in_short_format(NODE* t, struct LOOP* loop);

// ---- Truth values
NODE* simp_relop(NODE* t, struct LOOP* loop);
NODE* simp_QUEST(NODE* t, struct LOOP* loop);
// Of an integer operator on a conditional of constants and a constant: the conditional of the results.
NODE* apply_to_constant_arms(NODE* t, struct LOOP* loop);
NODE* simp_EXCLAIM(NODE* t, struct LOOP* loop);
NODE* simp_OROR(NODE* t, struct LOOP* loop); // and ANDAND

// ---- Casts
NODE* simp_SCONV(NODE* t, struct LOOP* loop);
NODE* simp_PCONV(NODE* t, struct LOOP* loop); // and ISP2CHAR

// ---- Places and addresses
NODE* simp_UMULT(NODE* t, struct LOOP* loop);
NODE* simp_STREF(NODE* t, struct LOOP* loop);
NODE* simp_STDOT(NODE* t, struct LOOP* loop);
NODE* simp_UAND(NODE* t, struct LOOP* loop);
NODE* simp_ARGREF(NODE* t, struct LOOP* loop);
NODE* simp_ACONV(NODE* t, struct LOOP* loop);
NODE* simp_PMCONV(NODE* t, struct LOOP* loop); // and PVCONV

// ---- Assignments and calls
NODE* simp_ASG(NODE* t, struct LOOP* loop);
NODE* simp_opASG(NODE* t, struct LOOP* loop);
NODE* simp_STASG(NODE* t, struct LOOP* loop);
NODE* simp_MEMCPY(NODE* t, struct LOOP* loop);
NODE* simp_call(NODE* t, struct LOOP* loop);
NODE* simp_ICALL(NODE* t, struct LOOP* loop); // the descriptor's own simplifier
NODE* simp_COMMAOP(NODE* t, struct LOOP* loop);
void install_BIF_simplifiers(); // once, after the descriptors are made

// ---- Vectors and complex values
NODE* simp_vector_node(NODE* t);
NODE* simp_vector_pack(NODE* t);
NODE* simp_vector_VFIELD(NODE* t);
NODE* simp_vector_VRCONV(NODE* t);
NODE* simp_vector_VSCONV(NODE* t);
NODE* simp_complexop(NODE* t, struct LOOP* loop);
