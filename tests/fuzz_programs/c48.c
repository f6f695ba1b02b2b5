// Options:   --seed 48 --no-argc --concise --max-funcs 4 --max-block-depth 3 --max-block-size 3 --max-expr-complexity 5 --max-array-len-per-dim 5
#include "csmith.h"


static long __undefined;



static uint64_t g_6 = 0UL;
static int32_t g_8 = 0xDDD1D8F8L;
static int32_t * volatile g_7 = &g_8;
static int32_t g_21 = 0x8331C587L;
static uint16_t g_25 = 0xB831L;
static int32_t g_68 = 0x453F4779L;
static volatile uint16_t g_75 = 1UL;
static volatile uint32_t g_84 = 1UL;
static int32_t *g_96 = &g_21;
static int32_t ** volatile g_95 = &g_96;
static int32_t ** volatile g_105 = &g_96;



static const int32_t  func_1(void);
static int8_t  func_14(int32_t * p_15, int64_t  p_16, uint32_t  p_17);
static int32_t * func_32(uint16_t * p_33);
static int32_t * const  func_34(int8_t  p_35, int32_t  p_36, uint8_t  p_37, int32_t * p_38, uint16_t  p_39);




static const int32_t  func_1(void)
{ 
    uint64_t l_2[2];
    int32_t l_28 = 0x95342363L;
    int i;
    for (i = 0; i < 2; i++)
        l_2[i] = 0UL;
    if ((l_2[1] , 0L))
    { 
        const int8_t l_3 = 0xEAL;
        return l_3;
    }
    else
    { 
        uint16_t l_18 = 1UL;
        int32_t *l_19 = &g_8;
        uint16_t *l_29 = &g_25;
        (*g_7) ^= (safe_rshift_func_uint16_t_u_u(g_6, 5));
        (*l_19) = ((safe_add_func_uint16_t_u_u(((safe_mul_func_uint16_t_u_u(((*l_29) = ((((*g_7) , (~g_6)) < func_14((l_18 , l_19), g_8, l_2[1])) , l_28)), g_21)) >= 0UL), (-1L))) == 6UL);
        for (g_21 = 0; (g_21 != (-20)); g_21 = safe_sub_func_int16_t_s_s(g_21, 4))
        { 
            (*g_7) = (*g_7);
            (*g_105) = func_32(&l_18);
        }
    }
    return (*g_96);
}



static int8_t  func_14(int32_t * p_15, int64_t  p_16, uint32_t  p_17)
{ 
    int32_t *l_20 = &g_21;
    int32_t *l_22 = (void*)0;
    int32_t l_23 = 0x70B168F9L;
    int32_t *l_24[1];
    int i;
    for (i = 0; i < 1; i++)
        l_24[i] = (void*)0;
    ++g_25;
    return g_6;
}



static int32_t * func_32(uint16_t * p_33)
{ 
    int8_t l_42 = 0x61L;
    int8_t l_50 = 1L;
    uint32_t l_51 = 0x88B1495DL;
    uint16_t *l_52 = &g_25;
    int32_t *l_53 = &g_21;
    int32_t **l_98 = (void*)0;
    int32_t **l_99 = &l_53;
    int32_t *l_100[5];
    int8_t l_101 = (-1L);
    uint32_t l_102[3][5][5] = {{{5UL,0UL,0x38EE533BL,0x5E97BC7EL,0xAAA56D44L},{0xB9EEC298L,6UL,7UL,1UL,18446744073709551607UL},{18446744073709551615UL,0xC5AECEF6L,0xD6DCB749L,1UL,1UL},{0xD8041E7DL,18446744073709551615UL,0xD8041E7DL,0x5E97BC7EL,0UL},{0UL,18446744073709551607UL,5UL,0xDE520ED3L,1UL}},{{0UL,0xB9EEC298L,0xC63C429AL,0UL,1UL},{0x38EE533BL,0UL,5UL,1UL,0xC5AECEF6L},{0xAAA56D44L,5UL,0xD8041E7DL,18446744073709551615UL,0x38EE533BL},{0UL,0xDE520ED3L,0xD6DCB749L,0UL,0xB9EEC298L},{1UL,7UL,0xC63C429AL,0xC63C429AL,7UL}},{{0x6D32418DL,0xCEA876B1L,0xD6DCB749L,7UL,0x3D77AE26L},{18446744073709551615UL,6UL,0UL,5UL,1UL},{0x3D77AE26L,0x5E97BC7EL,0xC63C429AL,0xA4178B3EL,0x38EE533BL},{18446744073709551615UL,0xF30D379EL,0x0FED7273L,0x6D32418DL,0xA4178B3EL},{0x6D32418DL,1UL,0xDE520ED3L,5UL,18446744073709551607UL}}};
    int i, j, k;
    for (i = 0; i < 5; i++)
        l_100[i] = &g_8;
    (*l_99) = func_34((safe_sub_func_uint64_t_u_u(g_8, (((((l_42 != (((l_42 & (((safe_lshift_func_uint16_t_u_s(((((((safe_unary_minus_func_int8_t_s(((((safe_rshift_func_int8_t_s_u((safe_lshift_func_uint8_t_u_u(l_50, 1)), l_51)) & g_21) , (void*)0) == l_52))) != g_25) != 0L) , &g_8) == l_53) < (*l_53)), g_25)) ^ 0xFEA44E0C42EF3998LL) & 0xF8L)) <= 0x55A9D45C545F0A86LL) , g_21)) , g_6) >= 0xE0E2L) ^ g_21) >= 0x61BCF2ECL))), (*l_53), (*l_53), &g_8, (*l_53));
    ++l_102[1][4][0];
    return &g_68;
}



static int32_t * const  func_34(int8_t  p_35, int32_t  p_36, uint8_t  p_37, int32_t * p_38, uint16_t  p_39)
{ 
    int16_t l_64 = (-1L);
    int32_t l_73 = (-5L);
    int32_t l_74[1][5][4] = {{{3L,(-6L),0x390AC9F7L,0x390AC9F7L},{0x30262A88L,0x30262A88L,4L,(-6L)},{(-6L),3L,4L,3L},{0x30262A88L,3L,0x390AC9F7L,4L},{3L,3L,3L,3L}}};
    int32_t * const l_97 = &g_21;
    int i, j, k;
    for (g_6 = 0; (g_6 > 1); g_6++)
    { 
        int8_t l_65 = 0x90L;
        int32_t *l_72[1];
        int i;
        for (i = 0; i < 1; i++)
            l_72[i] = &g_8;
        for (g_8 = 27; (g_8 > 3); g_8--)
        { 
            int32_t l_62 = (-1L);
            int16_t l_63[3][5] = {{0xF08EL,0xF535L,0x7891L,0xCC76L,0x7891L},{0x7891L,0x7891L,0xA6B3L,0xCC76L,7L},{0xF535L,0xF08EL,0xF08EL,0xF535L,0x7891L}};
            int32_t *l_69 = &g_68;
            int i, j;
            for (p_35 = 0; (p_35 <= (-10)); p_35 = safe_sub_func_uint8_t_u_u(p_35, 2))
            { 
                int32_t *l_66 = (void*)0;
                int32_t *l_67 = &g_68;
                l_65 &= ((safe_sub_func_int64_t_s_s((((0x403AL > l_62) == (l_63[1][2] & (((((*p_38) == 5L) && 0x75F08A7CF5EE2CBDLL) >= p_39) < p_35))) , 0x220C99D02BD444C6LL), l_64)) && l_62);
                (*l_67) |= (-1L);
            }
            (*l_69) = 5L;
            for (p_39 = (-18); (p_39 > 40); p_39++)
            { 
                return &g_8;
            }
        }
        ++g_75;
        for (p_35 = 0; (p_35 != (-25)); p_35 = safe_sub_func_uint64_t_u_u(p_35, 5))
        { 
            int32_t *l_82 = &l_74[0][0][0];
            uint16_t *l_93 = &g_25;
            uint16_t l_94[4] = {65535UL,65535UL,65535UL,65535UL};
            int i;
            for (g_25 = (-26); (g_25 <= 8); ++g_25)
            { 
                int32_t **l_83[3];
                uint16_t *l_92 = (void*)0;
                uint16_t **l_91 = &l_92;
                int i;
                for (i = 0; i < 3; i++)
                    l_83[i] = &l_82;
                p_38 = l_82;
                g_84++;
                (*g_7) &= (safe_lshift_func_uint16_t_u_u((safe_add_func_int8_t_s_s(((((((*l_91) = &g_25) == l_93) , ((*l_82) = (g_25 != p_37))) > 0x653F56D1L) , p_36), p_36)), l_73));
            }
            (*g_7) = l_94[3];
            (*g_95) = &l_74[0][4][0];
        }
    }
    (*p_38) = ((&p_38 != (void*)0) , 0x9A6A910BL);
    return l_97;
}





int main (void)
{
    int print_hash_value = 0;
    platform_main_begin();
    crc32_gentab();
    func_1();
    transparent_crc(g_6, "g_6", print_hash_value);
    transparent_crc(g_8, "g_8", print_hash_value);
    transparent_crc(g_21, "g_21", print_hash_value);
    transparent_crc(g_25, "g_25", print_hash_value);
    transparent_crc(g_68, "g_68", print_hash_value);
    transparent_crc(g_75, "g_75", print_hash_value);
    transparent_crc(g_84, "g_84", print_hash_value);
    platform_main_end(crc32_context ^ 0xFFFFFFFFUL, print_hash_value);
    return 0;
}
