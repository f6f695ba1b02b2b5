// Options:   --seed 26 --no-argc --concise --max-funcs 4 --max-block-depth 3 --max-block-size 3 --max-expr-complexity 5 --max-array-len-per-dim 5
#include "csmith.h"


static long __undefined;



static volatile int32_t g_3 = 0x53A34C86L;
static int32_t g_4 = 3L;
static volatile int32_t g_5 = 0x40F2FDADL;
static int32_t g_6[3] = {0x19D81479L,0x19D81479L,0x19D81479L};
static int32_t g_18 = 0x26FBD10CL;
static int32_t * volatile g_17 = &g_18;
static volatile uint32_t g_19[5][2][1] = {{{0xF888C554L},{0xDE81D534L}},{{0xF888C554L},{0xDE81D534L}},{{0xF888C554L},{0xDE81D534L}},{{0xF888C554L},{0xDE81D534L}},{{0xF888C554L},{0xDE81D534L}}};
static int32_t * volatile g_20[4] = {&g_6[0],&g_6[0],&g_6[0],&g_6[0]};
static uint64_t g_43 = 0x46AC1DEA90CFFAE3LL;
static int32_t g_48[3] = {(-1L),(-1L),(-1L)};
static int32_t * volatile g_47[2][1][1] = {{{&g_48[0]}},{{&g_48[0]}}};
static int32_t * volatile g_49 = (void*)0;
static int32_t * volatile g_50 = &g_48[0];
static int32_t *g_53[4][5] = {{&g_4,&g_4,&g_4,&g_4,&g_4},{&g_48[1],&g_48[1],&g_48[1],&g_48[1],&g_48[1]},{&g_4,&g_4,&g_4,&g_4,&g_4},{&g_48[1],&g_48[1],&g_48[1],&g_48[1],&g_48[1]}};
static int32_t **g_52[2] = {&g_53[0][1],&g_53[0][1]};



static const uint8_t  func_1(void);
static uint8_t  func_14(int16_t  p_15);
static int8_t  func_26(int16_t  p_27, uint32_t  p_28, int64_t  p_29);
static int16_t  func_30(uint8_t  p_31, int32_t * p_32);




static const uint8_t  func_1(void)
{ 
    int64_t l_2[1];
    int i;
    for (i = 0; i < 1; i++)
        l_2[i] = 0xA42B4837182ABBF9LL;
    for (g_4 = 0; (g_4 >= 0); g_4 -= 1)
    { 
        int16_t l_25[1];
        int32_t *l_61[1];
        int i;
        for (i = 0; i < 1; i++)
            l_25[i] = 0x6C28L;
        for (i = 0; i < 1; i++)
            l_61[i] = (void*)0;
        for (g_6[0] = 0; (g_6[0] <= 0); g_6[0] += 1)
        { 
            int64_t l_11 = 6L;
            int32_t *l_21 = (void*)0;
            int32_t *l_22 = &g_18;
            int i;
            (*l_22) = (l_2[g_6[0]] , ((safe_mul_func_int16_t_s_s(l_2[g_6[0]], (safe_sub_func_int8_t_s_s(((l_11 >= (safe_rshift_func_uint8_t_u_u(func_14(((0x8F9EL || l_2[0]) < g_4)), 1))) && g_19[3][1][0]), g_4)))) != g_6[0]));
        }
        for (g_18 = 0; (g_18 <= 0); g_18 += 1)
        { 
            int32_t *l_51 = &g_6[1];
            int32_t ***l_54 = &g_52[1];
            int32_t **l_56 = &l_51;
            int32_t ***l_55 = &l_56;
            (*l_51) = (((safe_rshift_func_int8_t_s_s(l_25[0], func_26(func_30(g_19[3][1][0], &g_4), g_18, l_2[0]))) , l_51) != (void*)0);
            (*l_55) = ((*l_54) = g_52[1]);
            (*g_50) &= (((safe_add_func_uint64_t_u_u((9L <= 1UL), (safe_add_func_uint32_t_u_u(((void*)0 != l_61[0]), 0xF447FE6DL)))) == (*l_51)) == 0xECE9L);
        }
    }
    return l_2[0];
}



static uint8_t  func_14(int16_t  p_15)
{ 
    int16_t l_16 = 3L;
    (*g_17) = l_16;
    return l_16;
}



static int8_t  func_26(int16_t  p_27, uint32_t  p_28, int64_t  p_29)
{ 
    int32_t *l_33 = &g_6[0];
    uint64_t *l_42 = &g_43;
    int32_t l_46[5][4] = {{2L,2L,1L,0x7D9FD593L},{0x0230A264L,2L,0x0230A264L,1L},{0x0230A264L,1L,1L,0x0230A264L},{0x2F52174DL,1L,0x7D9FD593L,1L},{1L,2L,0x7D9FD593L,0x7D9FD593L}};
    int i, j;
    (*l_33) = p_29;
    (*l_33) ^= p_27;
    (*g_50) ^= (((safe_div_func_uint64_t_u_u(((*l_33) != (safe_div_func_int32_t_s_s((safe_lshift_func_uint16_t_u_s(p_28, (((safe_add_func_uint64_t_u_u(((*l_42) = 0x19B17C08A59C2D16LL), (safe_div_func_uint32_t_u_u((p_29 < 7L), (*l_33))))) != p_28) && p_29))), (*l_33)))), l_46[1][2])) >= (*l_33)) == (*l_33));
    return p_27;
}



static int16_t  func_30(uint8_t  p_31, int32_t * p_32)
{ 
    return p_31;
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
    for (i = 0; i < 3; i++)
    {
        transparent_crc(g_6[i], "g_6[i]", print_hash_value);
        if (print_hash_value) printf("index = [%d]\n", i);

    }
    transparent_crc(g_18, "g_18", print_hash_value);
    for (i = 0; i < 5; i++)
    {
        for (j = 0; j < 2; j++)
        {
            for (k = 0; k < 1; k++)
            {
                transparent_crc(g_19[i][j][k], "g_19[i][j][k]", print_hash_value);
                if (print_hash_value) printf("index = [%d][%d][%d]\n", i, j, k);

            }
        }
    }
    transparent_crc(g_43, "g_43", print_hash_value);
    for (i = 0; i < 3; i++)
    {
        transparent_crc(g_48[i], "g_48[i]", print_hash_value);
        if (print_hash_value) printf("index = [%d]\n", i);

    }
    platform_main_end(crc32_context ^ 0xFFFFFFFFUL, print_hash_value);
    return 0;
}
