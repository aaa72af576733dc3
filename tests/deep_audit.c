/* An LD_AUDIT module whose PLT hook needs several KiB of the stack it runs
 * on, which is the stack of whoever made the call. */
#define _GNU_SOURCE
#include <link.h>
#include <stdint.h>

#pragma GCC diagnostic ignored "-Wunused-parameter"  /* the hooks' fixed signatures */

unsigned la_version(unsigned version) { return version; }

unsigned la_objopen(struct link_map *map, Lmid_t lmid, uintptr_t *cookie)
{
    return LA_FLG_BINDTO | LA_FLG_BINDFROM;
}

#if defined(__x86_64__)
#define la_pltenter la_x86_64_gnu_pltenter
typedef La_x86_64_regs La_regs;
#else
#define la_pltenter la_i86_gnu_pltenter
typedef La_i86_regs La_regs;
#endif

ElfW(Addr) la_pltenter(ElfW(Sym) *sym, unsigned ndx, uintptr_t *refcook, uintptr_t *defcook,
                       La_regs *regs, unsigned *flags, const char *name, long *framesize)
{
    volatile char frame[6144];
    for (unsigned i = 0; i < sizeof frame; i += 64)
        frame[i] = 1;
    return sym->st_value;
}
