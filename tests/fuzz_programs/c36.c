// Options:   --seed 36 --no-argc --concise --max-funcs 4 --max-block-depth 3 --max-block-size 3 --max-expr-complexity 5 --max-array-len-per-dim 5
#include "csmith.h"


static long __undefined;


union U2 {
   uint8_t  f0;
   int32_t  f1;
   const volatile int8_t  f2;
   uint8_t  f3;
   const volatile signed f4 : 4;
};

union U3 {
   volatile int8_t  f0;
   const uint8_t  f1;
};


static volatile int32_t g_3 = 9L;
static volatile int32_t g_4 = 1L;
static volatile int32_t g_5 = 0x9F30CC2FL;
static int32_t g_6 = 0xA86BA47CL;
static const int8_t g_12 = 0x59L;
static int32_t g_25 = 0xE2C9BF5EL;
static int8_t g_36 = 0x65L;
static const int32_t *g_39 = (void*)0;
static const int32_t ** volatile g_38 = &g_39;
static volatile int32_t g_41 = 1L;
static int16_t g_42[1][1][4] = {{{(-1L),(-1L),(-1L),(-1L)}}};
static volatile uint8_t g_43 = 0xF1L;
static const union U2 g_54[3] = {{0x97L},{0x97L},{0x97L}};
static const union U2 g_59 = {0x9CL};
static const union U2 *g_58 = &g_59;
static uint16_t g_61[1][4] = {{1UL,1UL,1UL,1UL}};
static union U2 g_63 = {3UL};
static union U2 *g_65[3] = {&g_63,&g_63,&g_63};
static union U2 ** volatile g_64 = &g_65[0];
static int32_t g_67 = (-1L);
static union U3 g_69[2] = {{6L},{6L}};
static volatile int8_t g_73 = 0xC2L;
static volatile int8_t g_74 = 0L;
static volatile int8_t g_75 = 7L;
static volatile int8_t g_76[3][3] = {{(-1L),(-1L),(-1L)},{4L,4L,4L},{(-1L),(-1L),(-1L)}};
static volatile int8_t g_77 = (-1L);
static volatile int8_t g_78 = 0x57L;
static volatile int8_t g_79 = 0x78L;
static volatile int8_t *g_72[4][4] = {{&g_76[0][2],&g_74,&g_76[0][2],&g_74},{&g_76[0][2],&g_74,&g_76[0][2],&g_74},{&g_76[0][2],&g_74,&g_76[0][2],&g_74},{&g_76[0][2],&g_74,&g_76[0][2],&g_74}};



static uint16_t  func_1(void);
static int16_t  func_9(const int8_t * const  p_10);
static union U3 * func_26(uint32_t  p_27);
static union U2 * func_31(int8_t  p_32, int8_t * p_33);




static uint16_t  func_1(void)
{ 
    int32_t l_2[4] = {9L,9L,9L,9L};
    const int8_t * const l_11 = &g_12;
    int32_t l_89 = 0x6B9E65AFL;
    int i;
    for (g_6 = 0; (g_6 <= 3); g_6 += 1)
    { 
        int32_t *l_80 = &g_67;
        int i;
        (*l_80) = (l_2[g_6] ^ (safe_rshift_func_int16_t_s_s(func_9(l_11), (((void*)0 == g_72[1][2]) && l_2[g_6]))));
        l_89 &= (safe_sub_func_int8_t_s_s((safe_mod_func_int8_t_s_s((safe_sub_func_uint64_t_u_u((*l_80), g_61[0][1])), (safe_lshift_func_int8_t_s_u((*l_80), 5)))), l_2[2]));
    }
    return l_89;
}



static int16_t  func_9(const int8_t * const  p_10)
{ 
    int16_t l_21 = 5L;
    uint16_t l_22 = 1UL;
    int32_t l_23 = (-1L);
    int32_t *l_24[2];
    int32_t l_30 = 0x23B19D88L;
    union U3 **l_70 = (void*)0;
    union U3 *l_71 = (void*)0;
    int i;
    for (i = 0; i < 2; i++)
        l_24[i] = &g_25;
    g_5 &= (g_25 ^= (safe_rshift_func_uint16_t_u_u((((safe_div_func_uint64_t_u_u((safe_rshift_func_int16_t_s_s((safe_lshift_func_int8_t_s_s(l_21, (*p_10))), (l_23 = (((l_21 && l_21) != l_22) & 1UL)))), l_21)) && l_23) == l_22), l_22)));
    l_71 = func_26((safe_sub_func_uint32_t_u_u(0xA87EA82BL, (g_25 = l_30))));
    return g_67;
}



static union U3 * func_26(uint32_t  p_27)
{ 
    uint8_t l_34 = 252UL;
    int8_t *l_35 = &g_36;
    int32_t *l_66[2];
    union U3 *l_68 = &g_69[0];
    int i;
    for (i = 0; i < 2; i++)
        l_66[i] = &g_67;
    (*g_64) = func_31(l_34, l_35);
    g_67 |= (l_34 & (**g_38));
    return l_68;
}



static union U2 * func_31(int8_t  p_32, int8_t * p_33)
{ 
    const int32_t *l_37 = &g_25;
    int32_t *l_40[1][5] = {{&g_6,&g_6,&g_6,&g_6,&g_6}};
    const union U2 *l_53 = &g_54[2];
    const union U2 **l_55 = &l_53;
    const union U2 *l_57 = &g_54[2];
    const union U2 **l_56[4][3][3] = {{{&l_57,&l_57,&l_57},{&l_57,&l_57,&l_57},{(void*)0,&l_57,(void*)0}},{{&l_57,&l_57,&l_57},{&l_57,&l_57,&l_57},{(void*)0,&l_57,(void*)0}},{{&l_57,&l_57,&l_57},{&l_57,&l_57,&l_57},{(void*)0,&l_57,(void*)0}},{{&l_57,&l_57,&l_57},{&l_57,&l_57,&l_57},{(void*)0,&l_57,(void*)0}}};
    const union U2 *l_60[5] = {&g_54[1],&g_54[1],&g_54[1],&g_54[1],&g_54[1]};
    union U2 *l_62 = &g_63;
    int i, j, k;
    (*g_38) = l_37;
    --g_43;
    g_61[0][2] ^= (((+((*g_39) < (safe_rshift_func_int8_t_s_s(((*p_33) ^= (*l_37)), ((1UL == (safe_div_func_int16_t_s_s((safe_mul_func_int8_t_s_s(((((((g_58 = ((*l_55) = l_53)) == l_60[4]) | (-1L)) & 0x04L) && 0x2B86L) >= g_41), 0x4AL)), 0x9BFFL))) , 8L))))) > p_32) > (-1L));
    return l_62;
}





int main (void)
{
    int i, j, k;
    int print_hash_value = 0;
    platform_main_begin();
    crc32_gentab();
    func_1();
    transparent_crc(g_3, "g_3", print_hash_value);
    transparent_crc(g_4, "g_4", print_hash_value);
    transparent_crc(g_5, "g_5", print_hash_value);
    transparent_crc(g_6, "g_6", print_hash_value);
    transparent_crc(g_12, "g_12", print_hash_value);
    transparent_crc(g_25, "g_25", print_hash_value);
    transparent_crc(g_36, "g_36", print_hash_value);
    transparent_crc(g_41, "g_41", print_hash_value);
    for (i = 0; i < 1; i++)
    {
        for (j = 0; j < 1; j++)
        {
            for (k = 0; k < 4; k++)
            {
                transparent_crc(g_42[i][j][k], "g_42[i][j][k]", print_hash_value);
                if (print_hash_value) printf("index = [%d][%d][%d]\n", i, j, k);

            }
        }
    }
    transparent_crc(g_43, "g_43", print_hash_value);
    for (i = 0; i < 3; i++)
    {
        transparent_crc(g_54[i].f0, "g_54[i].f0", print_hash_value);
        transparent_crc(g_54[i].f2, "g_54[i].f2", print_hash_value);
        transparent_crc(g_54[i].f3, "g_54[i].f3", print_hash_value);
        if (print_hash_value) printf("index = [%d]\n", i);

    }
    transparent_crc(g_59.f0, "g_59.f0", print_hash_value);
    transparent_crc(g_59.f2, "g_59.f2", print_hash_value);
    transparent_crc(g_59.f3, "g_59.f3", print_hash_value);
    for (i = 0; i < 1; i++)
    {
        for (j = 0; j < 4; j++)
        {
            transparent_crc(g_61[i][j], "g_61[i][j]", print_hash_value);
            if (print_hash_value) printf("index = [%d][%d]\n", i, j);

        }
    }
    transparent_crc(g_63.f0, "g_63.f0", print_hash_value);
    transparent_crc(g_63.f2, "g_63.f2", print_hash_value);
    transparent_crc(g_63.f3, "g_63.f3", print_hash_value);
    transparent_crc(g_67, "g_67", print_hash_value);
    for (i = 0; i < 2; i++)
    {
        transparent_crc(g_69[i].f0, "g_69[i].f0", print_hash_value);
        transparent_crc(g_69[i].f1, "g_69[i].f1", print_hash_value);
        if (print_hash_value) printf("index = [%d]\n", i);

    }
    transparent_crc(g_73, "g_73", print_hash_value);
    transparent_crc(g_74, "g_74", print_hash_value);
    transparent_crc(g_75, "g_75", print_hash_value);
    for (i = 0; i < 3; i++)
    {
        for (j = 0; j < 3; j++)
        {
            transparent_crc(g_76[i][j], "g_76[i][j]", print_hash_value);
            if (print_hash_value) printf("index = [%d][%d]\n", i, j);

        }
    }
    transparent_crc(g_77, "g_77", print_hash_value);
    transparent_crc(g_78, "g_78", print_hash_value);
    transparent_crc(g_79, "g_79", print_hash_value);
    platform_main_end(crc32_context ^ 0xFFFFFFFFUL, print_hash_value);
    return 0;
}
