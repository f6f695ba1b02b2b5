// Options:   --seed 44 --no-argc --concise --max-funcs 4 --max-block-depth 3 --max-block-size 3 --max-expr-complexity 5 --max-array-len-per-dim 5
#include "csmith.h"


static long __undefined;


struct S0 {
   signed f0 : 4;
   volatile unsigned f1 : 9;
   const signed f2 : 7;
   volatile signed f3 : 7;
   const signed f4 : 10;
};


static volatile uint32_t g_6 = 0xFC3938DDL;
static uint8_t g_13 = 255UL;
static uint8_t *g_23 = (void*)0;
static int32_t g_27 = (-1L);
static int32_t * volatile g_26[5][4] = {{&g_27,&g_27,&g_27,&g_27},{&g_27,&g_27,&g_27,&g_27},{&g_27,&g_27,&g_27,&g_27},{&g_27,&g_27,&g_27,&g_27},{&g_27,&g_27,&g_27,&g_27}};
static int32_t * volatile g_28 = &g_27;
static uint32_t g_32 = 9UL;
static int32_t *g_55 = &g_27;
static uint64_t g_56 = 0x53A2AD41D6648539LL;
static volatile struct S0 g_70[2][4][4] = {{{{3,11,3,5,-6},{-0,16,-6,5,12},{-0,16,-6,5,12},{3,11,3,5,-6}},{{-0,16,-6,5,12},{3,11,3,5,-6},{-0,16,-6,5,12},{-0,16,-6,5,12}},{{3,11,3,5,-6},{3,11,3,5,-6},{-2,10,-5,4,-4},{3,11,3,5,-6}},{{3,11,3,5,-6},{-0,16,-6,5,12},{-0,16,-6,5,12},{3,11,3,5,-6}}},{{{-0,16,-6,5,12},{3,11,3,5,-6},{-0,16,-6,5,12},{-0,16,-6,5,12}},{{3,11,3,5,-6},{3,11,3,5,-6},{-2,10,-5,4,-4},{3,11,3,5,-6}},{{3,11,3,5,-6},{-0,16,-6,5,12},{-2,10,-5,4,-4},{-0,16,-6,5,12}},{{-2,10,-5,4,-4},{-0,16,-6,5,12},{-2,10,-5,4,-4},{-2,10,-5,4,-4}}}};
static int8_t g_80 = (-6L);
static uint32_t g_83 = 4294967293UL;
static uint32_t g_86[1][4][2] = {{{0xD7EC325DL,0xD7EC325DL},{0xD7EC325DL,0xD7EC325DL},{0xD7EC325DL,0xD7EC325DL},{0xD7EC325DL,0xD7EC325DL}}};
static int32_t ** const  volatile g_101 = &g_55;
static uint16_t g_106 = 0xC337L;
static int64_t g_113 = 0xB1B7DE0C385723E8LL;
static int32_t g_115[3][3] = {{0x9F78EB29L,0x015BDF58L,0x9F78EB29L},{0x9F78EB29L,0x015BDF58L,0x9F78EB29L},{0x9F78EB29L,0x015BDF58L,0x9F78EB29L}};
static int32_t g_117 = 0xF146544CL;
static int32_t * volatile g_119 = &g_117;



static uint32_t  func_1(void);
static uint16_t  func_2(uint64_t  p_3);
static uint64_t  func_14(uint8_t * p_15, uint16_t  p_16, const uint8_t * const  p_17);
static uint8_t * func_18(int32_t  p_19, int64_t  p_20, uint8_t * p_21, uint8_t * p_22);




static uint32_t  func_1(void)
{ 
    int64_t l_11 = (-1L);
    uint8_t *l_12 = &g_13;
    int32_t *l_118 = &g_115[0][1];
    (*g_119) = ((*l_118) = (func_2((((-1L) && ((safe_rshift_func_uint16_t_u_s(g_6, 4)) , ((safe_rshift_func_uint8_t_u_u((safe_sub_func_uint8_t_u_u(((*l_12) = l_11), (func_14(func_18(g_6, l_11, g_23, g_23), l_11, g_23) | l_11))), 2)) & g_106))) , g_83)) == l_11));
    l_118 = l_118;
    return (*l_118);
}



static uint16_t  func_2(uint64_t  p_3)
{ 
    int64_t l_109 = (-1L);
    int64_t *l_112 = &g_113;
    int32_t *l_114 = &g_115[0][2];
    int32_t *l_116 = &g_117;
    (*g_55) = (safe_rshift_func_int8_t_s_u((0xFCL > p_3), 1));
    (*g_55) |= (-1L);
    (*l_116) &= ((*l_114) = (((*g_55) ^= l_109) == ((0x12C0L | p_3) <= ((((*l_112) = (safe_mul_func_uint8_t_u_u(p_3, l_109))) != g_56) != p_3))));
    return (*l_116);
}



static uint64_t  func_14(uint8_t * p_15, uint16_t  p_16, const uint8_t * const  p_17)
{ 
    uint32_t l_60 = 0x08E27FB6L;
    int64_t l_71 = 0xD4E4AF0E761D3F42LL;
    int64_t l_72 = 1L;
    int8_t l_89 = 0L;
    int32_t *l_92 = &g_27;
    for (g_32 = (-7); (g_32 >= 5); ++g_32)
    { 
        int32_t *l_59[5][5];
        int8_t * const *l_102 = (void*)0;
        int i, j;
        for (i = 0; i < 5; i++)
        {
            for (j = 0; j < 5; j++)
                l_59[i][j] = &g_27;
        }
        ++l_60;
        if ((safe_add_func_int16_t_s_s((g_56 < (!(0x4D73BB84767EE7A7LL & ((safe_mul_func_uint8_t_u_u((safe_lshift_func_int16_t_s_s((((((g_70[1][0][1] , g_23) == g_23) , g_70[1][0][1].f0) < g_32) != l_71), p_16)), l_72)) > 1UL)))), g_32)))
        { 
            int8_t *l_79 = &g_80;
            int32_t l_81 = 0xFA172C13L;
            uint32_t *l_82 = &g_83;
            uint32_t *l_84 = (void*)0;
            uint32_t *l_85 = &g_86[0][3][0];
            int8_t *l_87 = (void*)0;
            int8_t *l_88 = (void*)0;
            (*g_55) |= (((safe_mul_func_int8_t_s_s((l_89 = ((-1L) == (((*l_85) = ((*l_82) = (safe_add_func_uint32_t_u_u((safe_rshift_func_int8_t_s_s(((*l_79) = p_16), l_81)), p_16)))) != l_81))), l_81)) , 0xD2E8L) || p_16);
            for (p_16 = 0; p_16 < 5; p_16 += 1)
            {
                for (g_6 = 0; g_6 < 5; g_6 += 1)
                {
                    l_59[p_16][g_6] = (void*)0;
                }
            }
        }
        else
        { 
            const int16_t l_98 = 0x2F67L;
            uint32_t l_99 = 1UL;
            int32_t *l_100 = &g_27;
            for (g_80 = 2; (g_80 > 11); g_80 = safe_add_func_uint8_t_u_u(g_80, 4))
            { 
                int32_t **l_93[1][3][4] = {{{&g_55,(void*)0,&g_55,(void*)0},{&g_55,(void*)0,&g_55,(void*)0},{&g_55,(void*)0,&g_55,(void*)0}}};
                int i, j, k;
                g_26[3][3] = l_92;
                return g_32;
            }
            if ((((((safe_mod_func_int32_t_s_s(((safe_lshift_func_uint16_t_u_s(p_16, (l_98 , (g_86[0][0][1] && (-9L))))) , p_16), l_99)) | l_98) | (*g_28)) | p_16) != l_99))
            { 
                return p_16;
            }
            else
            { 
                int8_t * const **l_103 = &l_102;
                (*g_101) = l_100;
                (*l_103) = l_102;
            }
        }
        (*g_55) = (safe_mod_func_int32_t_s_s((*l_92), 0xF8389229L));
    }
    return (*l_92);
}



static uint8_t * func_18(int32_t  p_19, int64_t  p_20, uint8_t * p_21, uint8_t * p_22)
{ 
    uint8_t l_24 = 1UL;
    int8_t l_25[3][1];
    uint8_t *l_31[5];
    int32_t *l_54 = (void*)0;
    int32_t **l_53[4][4][3] = {{{&l_54,&l_54,&l_54},{&l_54,(void*)0,&l_54},{&l_54,(void*)0,&l_54},{(void*)0,&l_54,&l_54}},{{&l_54,&l_54,&l_54},{&l_54,&l_54,&l_54},{&l_54,(void*)0,&l_54},{&l_54,(void*)0,&l_54}},{{&l_54,&l_54,(void*)0},{(void*)0,&l_54,&l_54},{&l_54,(void*)0,&l_54},{&l_54,(void*)0,(void*)0}},{{&l_54,&l_54,&l_54},{&l_54,&l_54,&l_54},{&l_54,&l_54,(void*)0},{&l_54,(void*)0,&l_54}}};
    int i, j, k;
    for (i = 0; i < 3; i++)
    {
        for (j = 0; j < 1; j++)
            l_25[i][j] = (-1L);
    }
    for (i = 0; i < 5; i++)
        l_31[i] = &l_24;
    (*g_28) = (l_24 > ((1L >= ((((((g_6 >= p_20) <= p_19) > p_19) , p_19) <= l_25[0][0]) , (-1L))) >= l_25[0][0]));
    g_56 ^= ((safe_rshift_func_int16_t_s_s((((g_32--) || (((p_19 > (safe_rshift_func_uint16_t_u_u((0x31DEFCECB2EC6F0DLL | (l_25[1][0] & ((((safe_mul_func_int8_t_s_s((safe_lshift_func_uint16_t_u_s((safe_sub_func_uint32_t_u_u((safe_mul_func_int8_t_s_s((safe_rshift_func_uint8_t_u_s((safe_lshift_func_int16_t_s_s(((g_55 = ((!(safe_add_func_int8_t_s_s((((((!l_25[0][0]) || 0xB2235412L) == l_25[2][0]) , p_19) < 0xBC1846E972F33BC6LL), (-1L)))) , &g_27)) == &g_27), 1)), 4)), 0UL)), (-1L))), g_6)), 0xBCL)) & g_32) ^ g_27) , g_32))), 6))) ^ p_20) <= g_27)) > 2L), 14)) != 0UL);
    return g_23;
}





int main (void)
{
    int i, j, k;
    int print_hash_value = 0;
    platform_main_begin();
    crc32_gentab();
    func_1();
    transparent_crc(g_6, "g_6", print_hash_value);
    transparent_crc(g_13, "g_13", print_hash_value);
    transparent_crc(g_27, "g_27", print_hash_value);
    transparent_crc(g_32, "g_32", print_hash_value);
    transparent_crc(g_56, "g_56", print_hash_value);
    for (i = 0; i < 2; i++)
    {
        for (j = 0; j < 4; j++)
        {
            for (k = 0; k < 4; k++)
            {
                transparent_crc(g_70[i][j][k].f0, "g_70[i][j][k].f0", print_hash_value);
                transparent_crc(g_70[i][j][k].f1, "g_70[i][j][k].f1", print_hash_value);
                transparent_crc(g_70[i][j][k].f2, "g_70[i][j][k].f2", print_hash_value);
                transparent_crc(g_70[i][j][k].f3, "g_70[i][j][k].f3", print_hash_value);
                transparent_crc(g_70[i][j][k].f4, "g_70[i][j][k].f4", print_hash_value);
                if (print_hash_value) printf("index = [%d][%d][%d]\n", i, j, k);

            }
        }
    }
    transparent_crc(g_80, "g_80", print_hash_value);
    transparent_crc(g_83, "g_83", print_hash_value);
    for (i = 0; i < 1; i++)
    {
        for (j = 0; j < 4; j++)
        {
            for (k = 0; k < 2; k++)
            {
                transparent_crc(g_86[i][j][k], "g_86[i][j][k]", print_hash_value);
                if (print_hash_value) printf("index = [%d][%d][%d]\n", i, j, k);

            }
        }
    }
    transparent_crc(g_106, "g_106", print_hash_value);
    transparent_crc(g_113, "g_113", print_hash_value);
    for (i = 0; i < 3; i++)
    {
        for (j = 0; j < 3; j++)
        {
            transparent_crc(g_115[i][j], "g_115[i][j]", print_hash_value);
            if (print_hash_value) printf("index = [%d][%d]\n", i, j);

        }
    }
    transparent_crc(g_117, "g_117", print_hash_value);
    platform_main_end(crc32_context ^ 0xFFFFFFFFUL, print_hash_value);
    return 0;
}
