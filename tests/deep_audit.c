/* An LD_AUDIT module whose PLT hook needs several KiB of the stack it runs
 * on, which is the stack of whoever made the call. */
#define _GNU_SOURCE
#include <link.h>
#include <stdint.h>

unsigned la_version(unsigned version) { return version; }

unsigned la_objopen(struct link_map *map, Lmid_t lmid, uintptr_t *cookie)
{
    (void)map, (void)lmid, (void)cookie;
    return LA_FLG_BINDTO | LA_FLG_BINDFROM;
}

static void use_stack(void)
{
    volatile char frame[6144];
    for (unsigned i = 0; i < sizeof frame; i += 64)
        frame[i] = 1;
}

#if defined(__x86_64__)
ElfW(Addr) la_x86_64_gnu_pltenter(ElfW(Sym) *sym, unsigned ndx, uintptr_t *refcook,
                                  uintptr_t *defcook, La_x86_64_regs *regs, unsigned *flags,
                                  const char *name, long *framesize)
#else
ElfW(Addr) la_i86_gnu_pltenter(ElfW(Sym) *sym, unsigned ndx, uintptr_t *refcook,
                               uintptr_t *defcook, La_i86_regs *regs, unsigned *flags,
                               const char *name, long *framesize)
#endif
{
    (void)ndx, (void)refcook, (void)defcook, (void)regs, (void)flags, (void)name;
    (void)framesize;
    use_stack();
    return sym->st_value;
}
