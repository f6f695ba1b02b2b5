// Options:   --seed 10 --no-argc --concise --max-funcs 4 --max-block-depth 3 --max-block-size 3 --max-expr-complexity 5 --max-array-len-per-dim 5
#include "csmith.h"


static long __undefined;


struct S1 {
   int16_t  f0;
   int32_t  f1;
   const volatile int64_t  f2;
   volatile signed f3 : 8;
   unsigned f4 : 6;
   int16_t  f5;
   unsigned f6 : 10;
   uint64_t  f7;
};

#pragma pack(push)
#pragma pack(1)
struct S3 {
   volatile signed f0 : 14;
   volatile unsigned f1 : 5;
   unsigned f2 : 5;
   volatile unsigned f3 : 14;
   signed f4 : 2;
   signed f5 : 7;
   signed f6 : 2;
   unsigned : 0;
};
#pragma pack(pop)


static uint32_t g_2 = 0x628405CEL;
static int32_t g_4 = 2L;
static const int8_t g_28 = 0x61L;
static int32_t g_36 = 0x021F5EB7L;
static struct S3 g_37 = {6,1,3,113,0,9,-1};
static volatile uint32_t g_42 = 0x72860109L;
static uint64_t g_51 = 0x757037A9E214278DLL;
static struct S1 g_55[4][5][2] = {{{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}}},{{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}}},{{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}}},{{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}},{{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL},{-1L,5L,0xA1A718AF62F62330LL,15,0,9L,21,1UL}}}};



static struct S1  func_1(void);
static int32_t * func_5(int32_t * const  p_6);
static int32_t * func_7(int32_t  p_8, uint16_t  p_9, int32_t  p_10, uint32_t  p_11, int32_t * p_12);
static struct S3  func_13(int64_t  p_14, uint64_t  p_15, int32_t * p_16, uint8_t  p_17, int8_t  p_18);




static struct S1  func_1(void)
{ 
    int32_t *l_3[4][2] = {{&g_4,&g_4},{&g_4,&g_4},{&g_4,&g_4},{&g_4,&g_4}};
    int i, j;
    g_4 &= g_2;
    l_3[2][1] = func_5(func_7(g_2, (func_13(g_2, (g_2 | ((safe_div_func_int16_t_s_s(((~(safe_mod_func_uint8_t_u_u((safe_rshift_func_uint16_t_u_s((safe_div_func_uint32_t_u_u((g_28 == 0xE3L), g_28)), 2)), g_4))) < g_4), g_2)) || 4294967292UL)), l_3[0][1], g_2, g_28) , g_4), g_28, g_28, l_3[2][0]));
    return g_55[1][3][0];
}



static int32_t * func_5(int32_t * const  p_6)
{ 
    uint64_t *l_50 = &g_51;
    int32_t l_54[3][4] = {{(-1L),0x0A9706E1L,(-1L),(-4L)},{(-1L),(-4L),(-4L),(-1L)},{0xB1092FBBL,(-4L),0x9D2D10A6L,(-4L)}};
    int i, j;
    (*p_6) ^= (safe_rshift_func_uint8_t_u_u(((--(*l_50)) < l_54[2][1]), 2));
    return &g_4;
}



static int32_t * func_7(int32_t  p_8, uint16_t  p_9, int32_t  p_10, uint32_t  p_11, int32_t * p_12)
{ 
    int32_t *l_38 = (void*)0;
    int32_t l_39 = (-1L);
    int32_t *l_40 = &g_4;
    int32_t *l_41[3][1];
    const int32_t l_47 = 1L;
    int i, j;
    for (i = 0; i < 3; i++)
    {
        for (j = 0; j < 1; j++)
            l_41[i][j] = (void*)0;
    }
    ++g_42;
    g_37.f0 = (safe_lshift_func_uint16_t_u_u(65535UL, ((((&l_39 != &g_36) ^ ((1L > 0x62130E9DL) , l_47)) ^ p_9) >= (*l_40))));
    return &g_4;
}



static struct S3  func_13(int64_t  p_14, uint64_t  p_15, int32_t * p_16, uint8_t  p_17, int8_t  p_18)
{ 
    uint8_t l_29 = 0xA2L;
    int32_t *l_34 = &g_4;
    int32_t *l_35 = &g_36;
    (*p_16) = l_29;
    (*l_35) |= (safe_add_func_uint8_t_u_u(0xADL, ((g_4 < 0xA332A5B4L) <= ((safe_mod_func_int16_t_s_s(((&g_4 != l_34) && g_4), (-1L))) == (*l_34)))));
    return g_37;
}





int main (void)
{
    int i, j, k;
    int print_hash_value = 0;
    platform_main_begin();
    crc32_gentab();
    func_1();
    transparent_crc(g_2, "g_2", print_hash_value);
    transparent_crc(g_4, "g_4", print_hash_value);
    transparent_crc(g_28, "g_28", print_hash_value);
    transparent_crc(g_36, "g_36", print_hash_value);
    transparent_crc(g_37.f0, "g_37.f0", print_hash_value);
    transparent_crc(g_37.f1, "g_37.f1", print_hash_value);
    transparent_crc(g_37.f2, "g_37.f2", print_hash_value);
    transparent_crc(g_37.f3, "g_37.f3", print_hash_value);
    transparent_crc(g_37.f4, "g_37.f4", print_hash_value);
    transparent_crc(g_37.f5, "g_37.f5", print_hash_value);
    transparent_crc(g_37.f6, "g_37.f6", print_hash_value);
    transparent_crc(g_42, "g_42", print_hash_value);
    transparent_crc(g_51, "g_51", print_hash_value);
    for (i = 0; i < 4; i++)
    {
        for (j = 0; j < 5; j++)
        {
            for (k = 0; k < 2; k++)
            {
                transparent_crc(g_55[i][j][k].f0, "g_55[i][j][k].f0", print_hash_value);
                transparent_crc(g_55[i][j][k].f1, "g_55[i][j][k].f1", print_hash_value);
                transparent_crc(g_55[i][j][k].f2, "g_55[i][j][k].f2", print_hash_value);
                transparent_crc(g_55[i][j][k].f3, "g_55[i][j][k].f3", print_hash_value);
                transparent_crc(g_55[i][j][k].f4, "g_55[i][j][k].f4", print_hash_value);
                transparent_crc(g_55[i][j][k].f5, "g_55[i][j][k].f5", print_hash_value);
                transparent_crc(g_55[i][j][k].f6, "g_55[i][j][k].f6", print_hash_value);
                transparent_crc(g_55[i][j][k].f7, "g_55[i][j][k].f7", print_hash_value);
                if (print_hash_value) printf("index = [%d][%d][%d]\n", i, j, k);

            }
        }
    }
    platform_main_end(crc32_context ^ 0xFFFFFFFFUL, print_hash_value);
    return 0;
}
