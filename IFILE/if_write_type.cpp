// The type section: which types are written, in which order, and their records.
//
// A type's number is its uid. Whatever a record names has been written before, so readers never look ahead. Classes,
// structs and unions may be recursive: their records name nothing, and their lists wait in `csu_queue` until the types
// of the elements can be written first.
#include "IFILE/if_writer.h"

#include "UTIL/abort.h"

namespace {
TYPE* final_type(TYPE* type) {
    while (type->equiv) type = type->equiv;
    return type;
}

// The registered types in tree order: each before those that are built on it.
template <class VISIT>
void walk_type_tree(TYPE* root, VISIT visit) {
    std::vector<TYPE*> stack{root};
    std::vector<TYPE*> children;
    while (!stack.empty()) {
        TYPE* type = stack.back();
        stack.pop_back();
        visit(type);
        children.clear();
        for (auto& [name, types] : type->based)
            for (TYPE* child : types) children.push_back(child);
        stack.insert(stack.end(), children.rbegin(), children.rend());
    }
}
} // namespace

void I_FILE::if_reference_type(TYPE* type) {
    if (!type) return;
    type->refd = true;
    final_type(type)->refd = true;
}

// ---- Records

void I_FILE::begin_type(const TYPE* type, int tag) {
    begin_payload();
    i_write_uint(type->uid);
    i_write_i8(tag);
}

void I_FILE::write_integral_type(TYPE* type) {
    int kind = type->ikind();
    begin_type(type, kind >= TYPE::ik_llong ? IFT_LLONG + (kind - TYPE::ik_llong) : kind);
    i_write_bool(type->expl_sign());
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_write_bool(type->is_bool());
    i_write_bool(type->boolean_flag() || type->ptm_int_flag());
    i_flush(IFR_TYPE);
}

void I_FILE::write_float_type(TYPE* type) {
    begin_type(type, IFT_FLOAT + type->fkind());
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_flush(IFR_TYPE);
}

void I_FILE::write_fixedpoint_type(TYPE* type) {
    begin_type(type, IFT_FIXEDPOINT);
    i_write_i8(type->binpt());
    i_write_bool(type->underlying_type()->is_signed());
    i_write_typeref(type->underlying_type());
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_flush(IFR_TYPE);
}

void I_FILE::write_complex_type(TYPE* type) {
    begin_type(type, IFT_COMPLEX);
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_write_typeref(type->part_type());
    i_flush(IFR_TYPE);
}

void I_FILE::write_typedef(TYPE* type) {
    begin_type(type, IFT_TYPEDEF);
    i_write_string(type->name().c_str(), 0);
    i_write_typeref(type->type_named());
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_write_bool(type->cpp);
    i_write_bool(type->is_lowered());
    i_write_psn(type->psn);
    i_flush(IFR_TYPE);
}

void I_FILE::write_addr_type(TYPE* type, int tag, TYPE* target) {
    begin_type(type, tag);
    i_write_typeref(target);
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_flush(IFR_TYPE);
}

void I_FILE::write_qual_type(TYPE* type) {
    begin_type(type, IFT_QUAL);
    i_write_typeref(type->type_qualified());
    i_write_uint(type->own_qual_bits());
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_flush(IFR_TYPE);
}

void I_FILE::write_array_type(TYPE* type) {
    begin_type(type, IFT_ARRAY);
    i_write_typeref(type->raw_elem_type());
    i_write_uint(type->num_elem());
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_write_bool(type->cpp);
    i_write_bool(type->is_complete());
    i_write_bool(type->is_vector());
    i_flush(IFR_TYPE);
}

void I_FILE::write_ptm_type(TYPE* type) {
    begin_type(type, IFT_PTM);
    i_write_typeref(type->type_pointed_to());
    i_write_typeref(type->ptm_class());
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_flush(IFR_TYPE);
}

void I_FILE::write_func_type(TYPE* type) {
    begin_type(type, IFT_FUNC);
    i_write_typeref(type->return_type());
    i_write_bool(type->vararg());
    i_write_bool(type->proto());
    i_write_i8(static_cast<int>(type->cc_kind()));
    i_write_bool(type->cpp);
    i_flush(IFR_TYPE);
    write_list_frame(type, IFT_LIST_HEADER, IFL_PARAMS);
    for (const fkPARAM* p = type->params(); p; p = p->next) write_param(type, *p);
    write_list_frame(type, IFT_LIST_TRAILER, IFL_PARAMS);
}

void I_FILE::write_enum_type(TYPE* type) {
    begin_type(type, IFT_ENUM);
    i_write_string(type->name().c_str(), 0);
    i_write_uint(type->size);
    i_write_uint(type->align);
    i_write_typeref(type->underlying_type());
    i_write_bool(type->cpp);
    i_write_psn(type->psn);
    i_flush(IFR_TYPE);
    write_listof_etors(type);
}

namespace {
const CSU_EXTRAS no_extras;

const CSU_EXTRAS& extras_of(const TYPE* type) {
    const CSU_EXTRAS* extras = type->csu_extras();
    return extras ? *extras : no_extras;
}
} // namespace

void I_FILE::write_csu_type(TYPE* type) {
    const CSU_EXTRAS& x = extras_of(type);
    const bool before[] = {x.base_classes.present, x.access_decls.present, x.friend_functions.present,
                           x.friend_classes.present, x.nested_types.present};
    const bool behind[] = {x.static_data.present, x.member_functions.present, x.parameters.present};
    bool long_form = type->csu_word() != 0;
    for (bool list : before) long_form |= list;
    for (bool list : behind) long_form |= list;

    begin_type(type, long_form ? IFT_CSU_LONG : IFT_CSU_SHORT);
    i_write_i8(type->kind == TYPE::tpk_struct ? 0 : type->kind == TYPE::tpk_union ? 1 : 2);
    i_write_string(type->name().c_str(), 0);
    i_write_bool(type->is_complete());
    i_write_bool(type->is_lowered());
    i_write_uint(type->size);
    i_write_uint(type->align);
    if (long_form) {
        i_write_uint(type->csu_word());
        for (bool list : before) i_write_bool(list);
    }
    i_write_bool(type->has_mdata_list());
    if (long_form)
        for (bool list : behind) i_write_bool(list);
    i_write_bool(type->is_struct_vector());
    i_write_bool(type->cpp);
    i_write_psn(type->psn);
    i_flush(IFR_TYPE);
    csu_queue.push_back(type);
}

void I_FILE::write_type_record(TYPE* type) {
    switch (type->kind) {
    case TYPE::tpk_void: begin_type(type, IFT_VOID); return i_flush(IFR_TYPE);
    case TYPE::tpk_int: return write_integral_type(type);
    case TYPE::tpk_float: return write_float_type(type);
    case TYPE::tpk_fixed: return write_fixedpoint_type(type);
    case TYPE::tpk_complex: return write_complex_type(type);
    case TYPE::tpk_pointer: return write_addr_type(type, IFT_ADDR, type->type_pointed_to());
    case TYPE::tpk_ref: return write_addr_type(type, IFT_REF, type->type_refd());
    case TYPE::tpk_qual: return write_qual_type(type);
    case TYPE::tpk_typedef: return write_typedef(type);
    case TYPE::tpk_array: return write_array_type(type);
    case TYPE::tpk_ptm: return write_ptm_type(type);
    case TYPE::tpk_func: return write_func_type(type);
    case TYPE::tpk_enum: return write_enum_type(type);
    case TYPE::tpk_class:
    case TYPE::tpk_struct:
    case TYPE::tpk_union: return write_csu_type(type);
    }
}

// ---- Lists

void I_FILE::write_list_frame(const TYPE* type, int tag, int list) {
    begin_type(type, tag);
    i_write_i8(list);
    i_flush(IFR_TYPE);
}

void I_FILE::write_param(const TYPE* owner, const fkPARAM& param) {
    begin_type(owner, IFT_PARAM);
    i_write_typeref(param.type);
    i_write_bool(false);
    i_write_uint(param.word);
    i_write_string(param.name.c_str(), 0);
    i_flush(IFR_TYPE);
}

void I_FILE::write_listof_etors(const TYPE* type) {
    bool is_signed = type->underlying_type()->is_signed();
    write_list_frame(type, IFT_LIST_HEADER, IFL_ETORS);
    for (const fkETOR* e = type->etors(); e; e = e->next) {
        begin_type(type, IFT_ETOR);
        i_write_string(e->name.c_str(), 0);
        if (is_signed)
            i_write_sint(e->value);
        else
            i_write_uint(static_cast<uint64_t>(e->value));
        i_write_psn(e->psn);
        i_flush(IFR_TYPE);
    }
    write_list_frame(type, IFT_LIST_TRAILER, IFL_ETORS);
}

void I_FILE::write_listof_mdata(const TYPE* type) {
    for (const fkMDATA* m = type->mdata(); m; m = m->next) if_write_type(m->type);
    write_list_frame(type, IFT_LIST_HEADER, IFL_MDATA);
    for (const fkMDATA* m = type->mdata(); m; m = m->next) {
        begin_type(type, IFT_MDATA);
        i_write_uint(m->ordinal);
        i_write_string(m->name.c_str(), 0);
        i_write_typeref(m->type);
        i_write_i8(static_cast<int>(m->access));
        i_write_sint(m->offset);
        i_write_i8(m->aux);
        i_write_uint(m->width);
        i_write_bool(m->is_bitfld);
        i_write_bool(m->flag3);
        i_write_bool(m->flag4);
        i_write_psn(m->psn);
        i_flush(IFR_TYPE);
    }
    write_list_frame(type, IFT_LIST_TRAILER, IFL_MDATA);
}

// One list of a class: the types of its elements, then the framed elements.
template <class ELEMENT, class TYPE_OF, class FIELDS>
void I_FILE::write_csu_list(const TYPE* type, int list, const CSU_LIST<ELEMENT>& elements, TYPE_OF type_of,
                            FIELDS fields) {
    if (!elements.present) return;
    for (const ELEMENT& e : elements.items) if_write_type(type_of(e));
    write_list_frame(type, IFT_LIST_HEADER, list);
    for (const ELEMENT& e : elements.items) {
        begin_type(type, if_list_tags[list]);
        fields(e);
        i_flush(IFR_TYPE);
    }
    write_list_frame(type, IFT_LIST_TRAILER, list);
}

void I_FILE::write_csu_type_lists(TYPE* type) {
    const CSU_EXTRAS& x = extras_of(type);
    auto its_type = [](const auto& e) { return e.type; };
    auto itself = [](TYPE* t) { return t; };
    auto no_type = [](const auto&) -> TYPE* { return nullptr; };

    write_csu_list(type, IFL_BCLASSES, x.base_classes, its_type, [this](const fkBCLASS& e) {
        i_write_typeref(e.type);
        i_write_sint(e.offset);
        i_write_i8(e.access);
        i_write_bool(e.is_virtual);
    });
    write_csu_list(type, IFL_ADECLS, x.access_decls, no_type, [this](const fkADECL& e) {
        i_write_uint(0);
        i_write_i8(e.access);
    });
    write_csu_list(type, IFL_FFRIENDS, x.friend_functions, its_type, [this](const fkFFRIEND& e) {
        i_write_string(e.name.c_str(), 0);
        i_write_typeref(e.type);
    });
    write_csu_list(type, IFL_CFRIENDS, x.friend_classes, itself, [this](TYPE* t) { i_write_typeref(t); });
    write_csu_list(type, IFL_NTYPES, x.nested_types, itself, [this](TYPE* t) { i_write_typeref(t); });
    if (type->has_mdata_list()) write_listof_mdata(type);
    write_csu_list(type, IFL_SDATA, x.static_data, its_type, [this](const fkSDATA& e) {
        i_write_string(e.name.c_str(), 0);
        i_write_typeref(e.type);
        i_write_i8(e.access);
    });
    write_csu_list(type, IFL_MFUNCS, x.member_functions, its_type, [this](const fkMFUNC& e) {
        i_write_string(e.name.c_str(), 0);
        i_write_typeref(e.type);
        i_write_i8(e.access);
        i_write_sint(e.word);
        for (bool flag : e.flags) i_write_bool(flag);
    });
    write_csu_list(type, IFL_PARAMS, x.parameters, its_type, [this](const fkPARAM& e) {
        i_write_typeref(e.type);
        i_write_bool(false);
        i_write_uint(e.word);
        i_write_string(e.name.c_str(), 0);
    });
}

// ---- Order

namespace {
// The types that the record of `type`, and of its list name.
void collect_parts(TYPE* type, std::vector<TYPE*>& parts) {
    switch (type->kind) {
    case TYPE::tpk_fixed:
    case TYPE::tpk_enum: parts.push_back(type->underlying_type()); break;
    case TYPE::tpk_complex: parts.push_back(type->part_type()); break;
    case TYPE::tpk_pointer: parts.push_back(type->type_pointed_to()); break;
    case TYPE::tpk_ref: parts.push_back(type->type_refd()); break;
    case TYPE::tpk_qual: parts.push_back(type->type_qualified()); break;
    case TYPE::tpk_typedef: parts.push_back(type->type_named()); break;
    case TYPE::tpk_array: parts.push_back(type->raw_elem_type()); break;
    case TYPE::tpk_ptm:
        parts.push_back(type->type_pointed_to());
        parts.push_back(type->ptm_class());
        break;
    case TYPE::tpk_func:
        parts.push_back(type->return_type());
        for (const fkPARAM* p = type->params(); p; p = p->next) parts.push_back(p->type);
        break;
    default: break; // the others name nothing
    }
}
} // namespace

void I_FILE::if_write_type(TYPE* type) {
    if (!type) return;
    struct STEP {
        TYPE* type;
        bool parts_written;
    };
    std::vector<STEP> stack{{final_type(type), false}};
    std::vector<TYPE*> parts;
    while (!stack.empty()) {
        STEP& top = stack.back();
        if (top.parts_written) {
            TYPE* ready = top.type;
            stack.pop_back();
            write_type_record(ready);
        } else if (top.type->writ) {
            stack.pop_back();
        } else {
            top.type->writ = true;
            top.parts_written = true;
            types_written = true;
            parts.clear();
            collect_parts(top.type, parts);
            for (auto part = parts.rbegin(); part != parts.rend(); ++part)
                if (*part && !final_type(*part)->writ) stack.push_back({final_type(*part), false});
        }
    }
}

// Writing a list may write further classes, whose lists then wait behind it.
void I_FILE::write_waiting_lists() {
    for (size_t i = 0; i < csu_queue.size(); i++) write_csu_type_lists(csu_queue[i]);
    csu_queue.clear();
}

void I_FILE::write_all_csu_types() {
    for (auto& [name, types] : TYPE_PKG::root_type->based)
        for (TYPE* type : types)
            if (type->kind >= TYPE::tpk_class && type->refd && !type->equiv) if_write_type(type);
    write_waiting_lists();
}

void I_FILE::write_type_tree() {
    walk_type_tree(TYPE_PKG::root_type, [this](TYPE* type) {
        if (type->refd && !type->equiv) if_write_type(type);
    });
    write_waiting_lists();
}

void I_FILE::if_write_all_types(bool keep_named) {
    int64_t start = if_tell();
    types_written = false;
    for (I_SYMTAB* sym : globals) {
        if_reference_type(sym->sym_type());
        if_reference_type(sym->sym_cpp_type());
    }
    TYPE::mark_named_types(TYPE_PKG::root_type, keep_named);
    TYPE::mark_refed_types(TYPE_PKG::root_type);
    write_all_csu_types();
    write_type_tree();
    if (types_written) {
        off_types = start;
        i_write_eof();
    }
    // The marks are of this output alone.
    walk_type_tree(TYPE_PKG::root_type, [](TYPE* type) { type->writ = type->refd = false; });
}
