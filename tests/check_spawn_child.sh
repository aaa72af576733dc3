#!/usr/bin/env bash
# The code a spawned child runs before execve calls nothing: no PLT entry, no
# sanitizer or coverage hook, no other function of the library.
#   check_spawn_child.sh OBJECT   (the shared object or the archive)
set -euo pipefail
code=$(objdump -dr --no-show-raw-insn "$1" | awk '/<_ZN12_GLOBAL__N_111start_childEPv>:/,/^$/')
if [ -z "$code" ]; then
    echo "no start_child in $1" >&2
    exit 1
fi
# Any call, any relocation (a call or jump out, not yet linked) and any jump
# that leaves the function.
calls=$(grep -E '\scall|\sR_(X86_64|386)_|\sjmp\s+[0-9a-f]+ <' <<<"$code" |
        grep -v -E 'jmp\s+[0-9a-f]+ <_ZN12_GLOBAL__N_111start_childEPv\+0x[0-9a-f]+>$' || true)
if [ -n "$calls" ]; then
    printf 'the child calls out before execve:\n%s\n' "$calls" >&2
    exit 1
fi
echo "start_child makes no call"
