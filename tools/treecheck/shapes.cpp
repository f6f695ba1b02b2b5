// Trees in the shape of the left sides of rewrites: what rows of patterns look for, with random operands, constants
// that stand in the relations that rows ask for, and now and then an operand or a constant that does not fit.

#include "tools/treecheck/generator.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/patterns.h"

namespace treecheck {

namespace {

using rules::FOUND;
using rules::TERM;

TYPE* with_sign(TYPE* type, bool is_unsigned) {
    if (is_unsigned) return tp->mk_unsigned(type);
    return type->size == tp->int_t->size ? tp->int_t : type->size == tp->long_t->size ? tp->long_t : tp->llong_t;
}

} // namespace

class SHAPE {
public:
    SHAPE(GENERATOR& g, int d) : make(g), depth(d) {}
    ~SHAPE() {
        for (NODE* t : operands) erase_tree(t);
    }
    SHAPE(const SHAPE&) = delete;
    SHAPE& operator=(const SHAPE&) = delete;

    NODE* tree(const TERM* t, TYPE* type) {
        switch (t->kind) {
        case TERM::OPERAND: return operand(t->slot, type);
        case TERM::CONSTANT: return number(constant(t->slot, type, false), type);
        case TERM::NUMBER: return number(INT65(t->number), type);
        case TERM::TOP: return number(INT65(static_cast<long>(type->size) - 1), tp->int_t);
        case TERM::HALF: return number(INT65(1) << INT65(static_cast<long>(type->size) - 1), type);
        default: return operation(t, type);
        }
    }

private:
    static NODE* number(INT65 v, TYPE* type) {
        NODE* n = mk_ICON(INT65(0), type);
        n->u.lval = truncate_to_type(v, type);
        return n;
    }

    NODE* operand(int slot, TYPE* type) {
        NODE*& known = operands[slot];
        const bool strays = known && make.random.one_in(20);
        if (known && !strays && equiv_mtypes(known->type, type)) return copy_tree(known);
        NODE* t = slot == FOUND::B ? make.truth(depth - 1) : make.value(type, make.random.one_in(2) ? 0 : depth - 1);
        if (slot != FOUND::B && make.random.one_in(6))
            t = maketree(ANDB, t, number(INT65((2L << make.random.pick(14)) - 1), type), type);
        if (!known && !tree_has_side_effects(t)) known = copy_tree(t);
        return t;
    }

    INT65 constant(int slot, TYPE* type, bool is_count) {
        RANDOM& random = make.random;
        const auto width = static_cast<unsigned>(type->size);
        INT65& c = constants[slot];
        if (known >> slot & 1) return random.one_in(20) ? c + INT65(1) : c;
        known |= 1u << slot;
        INT65 other = make.number(type);
        for (unsigned i = 0, n = 0; i < FOUND::CONSTANTS; ++i)
            if (i != static_cast<unsigned>(slot) && (known >> i & 1) && random.one_in(++n)) other = constants[i];
        switch (is_count ? 0 : random.pick(8)) {
        case 0: c = INT65(1 + random.pick(width - 1)); break;
        case 1: c = INT65(0, (uint64_t(2) << random.pick(width - 1)) - 1); break;
        case 2: c = INT65(1) << INT65(random.pick(width)); break;
        case 3: c = ~other; break;
        case 4: c = -other; break;
        case 5: c = (other + INT65(1)) >> INT65(1); break; // the highest bit of a mask of low ones
        case 6: c = INT65(1) << INT65(other.value & 15); break;
        default: c = make.number(type);
        }
        if (!is_count) c = truncate_to_type(c, type);
        return c;
    }

    NODE* operation(const TERM* t, TYPE* type) {
        switch (t->op) {
        case SLL:
        case SRL: return maketree(t->op, tree(t->left, type), count(t->right, type), type);
        case SCONV: {
            TYPE* to = with_sign(type, t->flag);
            NODE* x = tree(t->left, with_sign(type, !t->flag));
            return cast_to(type, cast_to(to, x));
        }
        case QUEST: {
            NODE* c = tree(t->left, type);
            NODE* a = tree(t->right, type);
            return maketree(QUEST, c, maketree(COLON, a, tree(t->third, type), type), type);
        }
        case ICALL: {
            NODE* a = tree(t->left, type);
            return extremum(t->flag, a, tree(t->right, type), type);
        }
        default:
            if (op_is_int_compare(t->op)) return compare(t, type);
            NODE* a = tree(t->left, type);
            return maketree(t->op, a, t->right ? tree(t->right, type) : nullptr, type);
        }
    }

    NODE* count(const TERM* t, TYPE* shifted) {
        if (t->kind == TERM::TOP) return tree(t, shifted);
        if (t->kind == TERM::CONSTANT) return number(constant(t->slot, shifted, true), tp->int_t);
        return tree(t, tp->int_t);
    }

    NODE* compare(const TERM* t, TYPE* type) {
        for (const TERM* side : {t->left, t->right})
            if (side->kind == TERM::OPERATOR && side->op == SCONV) type = with_sign(type, side->flag);
        NODE* a = tree(t->left, type);
        NODE* b = tree(t->right, type);
        const bool is_unsigned_order = t->op >= LE && type->is_unsigned();
        return maketree(is_unsigned_order ? t->op + (ULE - LE) : t->op, a, b, tp->int_t);
    }

    static NODE* extremum(bool maximum, NODE* a, NODE* b, TYPE* type) {
        const char* name = extremum_name(type, maximum);
        if (name) return mk_ICALL(name, maketree(COMMA, a, b, tp->int_t), type);
        return maketree(PLUS, a, b, type);
    }

    GENERATOR& make;
    const int depth;
    NODE* operands[FOUND::OPERANDS] = {}; // owned
    INT65 constants[FOUND::CONSTANTS];
    unsigned known = 0; // constants that have a value
};

NODE* GENERATOR::shape(TYPE* type, int depth, std::size_t pattern) {
    const TERM* t = rules::all_patterns()[pattern].left;
    if (!op_is_int_compare(t->op)) return SHAPE(*this, depth).tree(t, type);
    static TYPE* const types[] = {tp->int_t, tp->uint_t, tp->long_t, tp->ulong_t, tp->llong_t, tp->ullong_t};
    return cast_to(type, SHAPE(*this, depth).tree(t, types[random.pick(6)]));
}

} // namespace treecheck
