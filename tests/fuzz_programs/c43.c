// Options:   --seed 43 --no-argc --concise --max-funcs 4 --max-block-depth 3 --max-block-size 3 --max-expr-complexity 5 --max-array-len-per-dim 5
#include "csmith.h"


static long __undefined;


#pragma pack(push)
#pragma pack(1)
struct S0 {
   uint32_t  f0;
   uint64_t  f1;
   int8_t  f2;
   uint64_t  f3;
   int8_t  f4;
};
#pragma pack(pop)


static volatile int32_t g_2 = 0xA2768935L;
static volatile int32_t g_3 = (-1L);
static volatile int32_t g_4 = 0x260417BEL;
static int32_t g_5 = 0x95010F7AL;
static volatile int32_t g_11 = (-5L);
static int32_t g_12 = 0xA2282D56L;
static int32_t g_21 = 0xF3AC9D73L;
static int8_t g_41 = 0xDDL;
static int8_t g_43[4][3][3] = {{{0x9FL,9L,9L},{0L,0x31L,0x70L},{0x1EL,0x9FL,5L}},{{0L,0L,1L},{0x9FL,0x1EL,0x0FL},{0x31L,0L,0x31L}},{{9L,0x9FL,0L},{(-3L),0x31L,0x31L},{0L,9L,0x0FL}},{{1L,(-3L),1L},{0L,0L,5L},{(-3L),1L,0x70L}}};
static struct S0 g_45 = {0x1AAF1919L,18446744073709551615UL,0x8CL,0x5C74600EBE663439LL,-3L};
static struct S0 *g_46 = &g_45;
static int32_t g_48 = 0x550032DCL;
static int32_t * volatile g_47 = &g_48;
static int64_t g_98[3] = {0L,0L,0L};
static int16_t g_99 = (-1L);
static volatile int8_t g_101[4] = {2L,2L,2L,2L};
static volatile int64_t g_102[2][2] = {{0x9A7C9710A75E5FF0LL,0x9A7C9710A75E5FF0LL},{0x9A7C9710A75E5FF0LL,0x9A7C9710A75E5FF0LL}};
static volatile uint8_t g_104[5][4][1] = {{{4UL},{0UL},{4UL},{1UL}},{{246UL},{246UL},{1UL},{4UL}},{{0UL},{4UL},{1UL},{246UL}},{{246UL},{1UL},{4UL},{0UL}},{{4UL},{1UL},{246UL},{246UL}}};
static uint32_t g_109 = 0x92BC7F3FL;
static int32_t *g_116[1][4] = {{&g_21,&g_21,&g_21,&g_21}};
static int32_t ** volatile g_115 = &g_116[0][1];
static int32_t ** volatile *g_119 = (void*)0;
static int32_t g_131 = 0xAC6B420DL;
static int32_t * volatile g_146 = (void*)0;



static int16_t  func_1(void);
static int32_t * func_13(uint64_t  p_14, int32_t * p_15, int32_t  p_16, int32_t * p_17);
static uint64_t  func_18(int32_t * p_19);
static int32_t  func_51(int8_t * p_52);




static int16_t  func_1(void)
{ 
    uint16_t l_8[4] = {0x3A23L,0x3A23L,0x3A23L,0x3A23L};
    int32_t *l_20 = &g_5;
    struct S0 l_120 = {0xA947FBA1L,9UL,0x5DL,8UL,1L};
    int32_t l_144 = 0xE421836AL;
    int32_t *l_147 = &g_48;
    uint16_t l_148 = 0xEDB8L;
    int i;
    for (g_5 = 9; (g_5 < (-13)); g_5--)
    { 
        for (g_4 = 0; g_4 < 4; g_4 += 1)
        {
            l_8[g_4] = 65526UL;
        }
        if (l_8[0])
            continue;
        return g_2;
    }
    for (g_5 = (-18); (g_5 < 10); g_5 = safe_add_func_uint32_t_u_u(g_5, 5))
    { 
        const int8_t l_127 = 0xB0L;
        uint32_t l_140 = 18446744073709551607UL;
        for (g_12 = 3; (g_12 >= 0); g_12 -= 1)
        { 
            int32_t *l_117[5][1][1] = {{{&g_48}},{{&g_12}},{{&g_48}},{{&g_12}},{{&g_48}}};
            int i, j, k;
            (*g_115) = func_13(func_18(l_20), &g_12, ((0x37L == (-5L)) && 0L), l_117[3][0][0]);
            if ((l_120 , 0x1112FB1CL))
            { 
                int32_t *l_128 = (void*)0;
                int32_t *l_129 = (void*)0;
                int32_t *l_130 = &g_131;
                int32_t l_132 = 0x5CA99100L;
                uint16_t l_139 = 5UL;
                int32_t **l_143 = &g_116[0][1];
                int i;
                l_132 ^= (safe_rshift_func_int8_t_s_u(1L, ((((safe_add_func_uint64_t_u_u(((safe_add_func_int16_t_s_s((-4L), (((*l_130) = (l_8[g_12] ^ (((((0x533B3F44L && l_127) | 65527UL) , l_8[g_12]) ^ (-3L)) > g_3))) , 8L))) | g_99), l_127)) , 0x65L) , (*l_20)) || g_48)));
                l_140 = (0L && ((l_139 = (((((safe_lshift_func_int16_t_s_u((safe_sub_func_int32_t_s_s((((void*)0 == &g_45) && 1UL), l_8[g_12])), g_48)) && g_48) != g_2) <= (*l_20)) >= g_43[1][0][2])) == l_8[g_12]));
                l_117[4][0][0] = ((*l_143) = func_13(l_140, &l_132, ((((safe_rshift_func_int8_t_s_u(g_43[0][1][0], 2)) > 0x2A79L) , g_43[0][1][0]) ^ l_140), l_117[3][0][0]));
            }
            else
            { 
                l_144 &= 1L;
            }
            for (l_120.f2 = 3; (l_120.f2 >= 0); l_120.f2 -= 1)
            { 
                int64_t l_145[1][1][4];
                int i, j, k;
                for (i = 0; i < 1; i++)
                {
                    for (j = 0; j < 1; j++)
                    {
                        for (k = 0; k < 4; k++)
                            l_145[i][j][k] = 2L;
                    }
                }
                return l_145[0][0][2];
            }
        }
    }
    (*l_147) &= (*l_20);
    return l_148;
}



static int32_t * func_13(uint64_t  p_14, int32_t * p_15, int32_t  p_16, int32_t * p_17)
{ 
    g_119 = ((+18446744073709551606UL) , &g_115);
    return p_15;
}



static uint64_t  func_18(int32_t * p_19)
{ 
    uint32_t l_37 = 0xB24ADC9FL;
    int32_t *l_39 = &g_21;
    struct S0 *l_44 = &g_45;
    int32_t l_89 = 0L;
    int32_t l_94 = 5L;
    int32_t l_96 = 1L;
    int32_t l_97 = 0xDC513BADL;
    int32_t l_100 = 0x34B7DDD9L;
    for (g_21 = 0; (g_21 < (-23)); g_21 = safe_sub_func_uint8_t_u_u(g_21, 9))
    { 
        const uint32_t l_30 = 0UL;
        int32_t *l_38 = (void*)0;
        int8_t *l_40 = &g_41;
        int8_t *l_42 = &g_43[0][1][0];
        uint16_t l_86 = 0xA8C3L;
        int32_t l_90[5];
        int32_t l_91 = 0x3453D9EBL;
        int32_t l_103[5][1][5] = {{{1L,1L,1L,1L,1L}},{{0x6CEA3741L,0x6CEA3741L,0x6CEA3741L,0x6CEA3741L,0x6CEA3741L}},{{1L,1L,1L,1L,1L}},{{0x6CEA3741L,0x6CEA3741L,0x6CEA3741L,0x6CEA3741L,0x6CEA3741L}},{{1L,1L,1L,1L,1L}}};
        int32_t *l_107[2][3][2] = {{{&l_96,&g_21},{&g_21,&l_96},{&g_21,&g_21}},{{&l_96,&g_21},{&g_21,&l_96},{&g_21,&g_21}}};
        int32_t l_108 = 0xF54216E3L;
        int i, j, k;
        for (i = 0; i < 5; i++)
            l_90[i] = 0xD5C681E8L;
    }
    for (l_97 = 27; (l_97 < (-20)); --l_97)
    { 
        int32_t *l_114 = &l_100;
        (*g_115) = l_114;
    }
    l_44 = &g_45;
    return g_45.f0;
}



static int32_t  func_51(int8_t * p_52)
{ 
    int32_t *l_53[5][4] = {{&g_48,(void*)0,&g_48,&g_48},{(void*)0,(void*)0,&g_48,(void*)0},{(void*)0,&g_48,&g_48,(void*)0},{&g_48,(void*)0,&g_48,&g_48},{(void*)0,(void*)0,&g_48,(void*)0}};
    uint16_t l_54 = 0x6156L;
    int32_t l_57 = 0x67C8CEAAL;
    int i, j;
    l_54--;
    return l_57;
}





int main (void)
{
    int i, j, k;
    int print_hash_value = 0;
    platform_main_begin();
    crc32_gentab();
    func_1();
    transparent_crc(g_2, "g_2", print_hash_value);
    transparent_crc(g_3, "g_3", print_hash_value);
    transparent_crc(g_4, "g_4", print_hash_value);
    transparent_crc(g_5, "g_5", print_hash_value);
    transparent_crc(g_11, "g_11", print_hash_value);
    transparent_crc(g_12, "g_12", print_hash_value);
    transparent_crc(g_21, "g_21", print_hash_value);
    transparent_crc(g_41, "g_41", print_hash_value);
    for (i = 0; i < 4; i++)
    {
        for (j = 0; j < 3; j++)
        {
            for (k = 0; k < 3; k++)
            {
                transparent_crc(g_43[i][j][k], "g_43[i][j][k]", print_hash_value);
                if (print_hash_value) printf("index = [%d][%d][%d]\n", i, j, k);

            }
        }
    }
    transparent_crc(g_45.f0, "g_45.f0", print_hash_value);
    transparent_crc(g_45.f1, "g_45.f1", print_hash_value);
    transparent_crc(g_45.f2, "g_45.f2", print_hash_value);
    transparent_crc(g_45.f3, "g_45.f3", print_hash_value);
    transparent_crc(g_45.f4, "g_45.f4", print_hash_value);
    transparent_crc(g_48, "g_48", print_hash_value);
    for (i = 0; i < 3; i++)
    {
        transparent_crc(g_98[i], "g_98[i]", print_hash_value);
        if (print_hash_value) printf("index = [%d]\n", i);

    }
    transparent_crc(g_99, "g_99", print_hash_value);
    for (i = 0; i < 4; i++)
    {
        transparent_crc(g_101[i], "g_101[i]", print_hash_value);
        if (print_hash_value) printf("index = [%d]\n", i);

    }
    for (i = 0; i < 2; i++)
    {
        for (j = 0; j < 2; j++)
        {
            transparent_crc(g_102[i][j], "g_102[i][j]", print_hash_value);
            if (print_hash_value) printf("index = [%d][%d]\n", i, j);

        }
    }
    for (i = 0; i < 5; i++)
    {
        for (j = 0; j < 4; j++)
        {
            for (k = 0; k < 1; k++)
            {
                transparent_crc(g_104[i][j][k], "g_104[i][j][k]", print_hash_value);
                if (print_hash_value) printf("index = [%d][%d][%d]\n", i, j, k);

            }
        }
    }
    transparent_crc(g_109, "g_109", print_hash_value);
    transparent_crc(g_131, "g_131", print_hash_value);
    platform_main_end(crc32_context ^ 0xFFFFFFFFUL, print_hash_value);
    return 0;
}
