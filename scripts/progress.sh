#!/usr/bin/env bash
# COMMAND 2>&1 | scripts/progress.sh LOG
# Keeps the whole output of a build in LOG and shows ninja's progress: the
# status line kept up to date on a terminal, else one line at each tenth of
# the targets and at the last.
tty=0
[ -t 1 ] && tty=1
exec awk -v out="$1" -v tty=$tty '
    BEGIN { tenth = -1 }
    { print > out }
    /^\[[0-9]+\/[0-9]+\]/ {
        split(substr($0, 2, index($0, "]") - 2), n, "/")
        line = substr($0, 1, 110)
        if (tty) {
            printf "\r   %s\033[K%s", line, n[1] == n[2] ? "\n" : ""
            fflush()
        } else if (int(n[1] * 10 / n[2]) != tenth || n[1] == n[2]) {
            tenth = int(n[1] * 10 / n[2])
            print "   " line
            fflush()
        }
    }'
