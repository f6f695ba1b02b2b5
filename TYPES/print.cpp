// Types as text, in the manner of C's declarators.
#include "TYPES/type_impl.h"

static std::string qual_text(unsigned bits) {
    static const struct {
        unsigned bit;
        const char* text;
    } words[] = {
        {QUAL_CONST, "const "}, {QUAL_VOLATILE, "volatile "}, {QUAL_PACKED, "packed "}, {QUAL_NEAR, "near "},
        {QUAL_FAR, "far "},     {QUAL_RESTRICT, "restrict "}, {QUAL_IOPORT, "ioport "}, {QUAL_ONCHIP, "onchip "},
    };
    std::string text;
    for (auto& w : words)
        if (bits & w.bit) text += w.text;
    return text;
}

static std::string int_text(const TYPE* t) {
    static const char* const names[] = {"bool",  "signed char",    "unsigned char", "wchar_t",
                                        "short", "unsigned short", "int",           "unsigned int",
                                        "long",  "unsigned long",  "long long",     "unsigned long long"};
    return t->is_plain_char() ? "char" : names[t->ikind()];
}

// Parameter lists within parameter lists beyond this depth are cut short, the text is for people.
static const int max_depth = 3;

static std::string type_text(const TYPE* t, int depth);

static std::string params_text(const TYPE* t, int depth) {
    if (depth >= max_depth) return "(...)";
    std::string text = "(";
    for (fkPARAM* p = t->params(); p; p = p->next)
        text += (p == t->params() ? "" : ", ") + type_text(p->type, depth + 1);
    if (t->vararg()) text += t->params() ? ", ..." : "...";
    return text + ")";
}

// The text of a type that ends a declarator; the chain is stepped by `type_text`.
static std::string end_text(const TYPE* t, int depth) {
    static const char* const floats[] = {"float", "double", "long double"};
    switch (t->kind) {
    case TYPE::tpk_void: return "void";
    case TYPE::tpk_int: return int_text(t);
    case TYPE::tpk_float: return floats[t->fkind()];
    case TYPE::tpk_fixed: return "fixed<" + int_text(t->component()->real) + ", " + std::to_string(t->binpt()) + ">";
    case TYPE::tpk_complex: return "complex " + type_text(t->component(), depth);
    case TYPE::tpk_typedef: return t->name();
    case TYPE::tpk_enum: return "enum " + t->name();
    case TYPE::tpk_class: return "class " + t->name();
    case TYPE::tpk_struct: return "struct " + t->name();
    case TYPE::tpk_union: return "union " + t->name();
    default: tp_die("bad type kind: TYPE::print()");
    }
}

// What stands on the left comes in reverse order, what stands on the right in order: both only grow at the end.
static std::string type_text(const TYPE* t, int depth) {
    std::vector<std::string> left;
    std::string right;
    bool after_pointer = false; // an array or function behind a pointer takes the pointer in parentheses
    auto bracket = [&] {
        if (after_pointer) {
            left.push_back("(");
            right += ")";
        }
        after_pointer = false;
    };
    for (;; t = t->component()) {
        switch (t->kind) {
        case TYPE::tpk_pointer:
            left.push_back("*");
            after_pointer = true;
            continue;
        case TYPE::tpk_ref:
            left.push_back("&");
            after_pointer = true;
            continue;
        case TYPE::tpk_ptm:
            left.push_back(type_text(t->ptm_class()->real->is_csu() ? t->ptm_class()->real : t->pkg->void_t, depth) +
                           "::*");
            after_pointer = true;
            continue;
        case TYPE::tpk_qual: left.push_back(qual_text(t->own_qual_bits())); continue;
        case TYPE::tpk_array:
            bracket();
            right += t->is_vector() ? " vector[" : "[";
            if (t->is_complete()) right += std::to_string(t->num_elem());
            right += "]";
            continue;
        case TYPE::tpk_func:
            bracket();
            right += params_text(t, depth);
            continue;
        default: break;
        }
        break;
    }
    std::string text;
    size_t quals = left.size();
    // Qualifiers of the innermost type stand in front of it.
    while (quals > 0 && left[quals - 1].size() > 1 && left[quals - 1].back() == ' ') text += left[--quals];
    text += end_text(t, depth);
    if (quals > 0) text += " ";
    while (quals > 0) text += left[--quals];
    return text + right;
}

std::string TYPE::printstr() const { return type_text(this, 0); }

void TYPE::print(FILE* out) const { fputs(printstr().c_str(), out); }

void TYPE::println(FILE* out) const {
    print(out);
    fputc('\n', out);
}

void TYPE::dump(FILE* out) const {
    fprintf(out, "type %u: kind %d, size %llu, align %u, tu %u,%s%s%s%s%s \"%s\": ", uid, kind,
            static_cast<unsigned long long>(size), align, tu, frozen ? " frozen" : "", refd ? " refd" : "",
            writ ? " writ" : "", cpp ? " cpp" : "", merg ? " merg" : "", map_name.c_str());
    if (equiv) fprintf(out, "equiv %u: ", find_type(equiv)->uid);
    println(out);
}
