# shellcheck shell=bash
# With the spool the receiver takes messages of the common forms apart: their rows are those that syslog-ng's own parsers make.
source "$(dirname "$0")/support.sh"

for priority in {0..200} 007 1000; do
    echo "<$priority>Feb  1 10:00:00 host prog[1]: old $priority"
    echo "<$priority>1 2026-02-01T10:00:00Z host prog 1 - - new $priority"
done >"$root/messages"
times=('Feb  1 10:00:00' 'Feb 01 10:00:00' 'Feb 31 23:59:59' 'Feb 32 10:00:00' 'Feb  1 24:00:00' 'Feb  1 10:00:60' 'Feb  1 10:00:00.123'
    'Feb  1 2026 10:00:00' 'Feb  1 10:00:00 2026' 'Feb  1 10:00:00 2026:' 'Xyz  1 10:00:00' 'feb  1 10:00:00' '2026-02-01T10:00:00Z')
hosts=(host HOST-1.example.org 10.0.0.1 2026 2026.a 1.2 _h fe80::1 h@x 'h,x' 'h x' last Last 'last message repeated' message '' - ü)
programs=('p[1]:' p: 'p[1]' 'p[a]:' 'p[]:' 'p[1]]:' 'p[1]x:' 'p:x' 'p :' /usr/sbin/p: a/b.c-d_e: -: %ASA-1: 'p(1):' ü: 'forwarded from x:' "$(printf 'p%.0s' {1..300}):")
stamps=(2026-02-01T10:00:00Z 2026-02-01T10:00:00.123456+01:00 2026-02-31T10:00:00Z 2026-13-01T10:00:00Z 2026-02-01T10:00:60Z
    2026-02-01T10:00:00 2026-02-01T10:00:00.1234567Z 2026-02-01T10:00:00+14:59 2026-02-01T10:00:00-00:00 - x)
rests=('p 1 ID -' 'p - - -' '- - - -' 'p 1 - [a b="c"]' 'p 1 -' 'p  1 - -' 'p[1]: 1 - -' "$(printf 'p%.0s' {1..60}) 1 - -" "p $(printf '1%.0s' {1..130}) - -")
texts=(text ' text' '  ' '' ü $'\xef\xbb\xbfbom' '- text' 'a: b[1]: c' $'\x01' '[1]: ')
{
    for time in "${times[@]}"; do echo "<13>$time host p: time $time"; done
    for host in "${hosts[@]}"; do
        echo "<13>Feb  1 10:00:00 $host p: host $host"
        echo "<13>1 2026-02-01T10:00:00Z $host p 1 - - host $host"
    done
    for program in "${programs[@]}"; do echo "<13>Feb  1 10:00:00 host $program program $program"; done
    for stamp in "${stamps[@]}"; do echo "<13>1 $stamp host p 1 - - stamp $stamp"; done
    for rest in "${rests[@]}"; do echo "<13>1 2026-02-01T10:00:00Z host $rest rest $rest"; done
    for text in "${texts[@]}"; do
        echo "<13>Feb  1 10:00:00 host p: $text"
        echo "<13>1 2026-02-01T10:00:00Z host p 1 - - $text"
    done
    printf '<13>Feb  1 10:00:00 h%s p: long host\n' "$(printf 'h%.0s' {1..300})"
} >>"$root/messages"
total=$(wc -l <"$root/messages")
# What only a frame or a datagram can have.
for text in 'a\0b' 'line\nfeed' 'end\n' 'end\0' 'two\n\n' '\0'; do
    for head in '<13>Feb  1 10:00:00 host p: ' '<13>1 2026-02-01T10:00:00Z host p 1 - - '; do
        printf "%s$text" "$head" >"$root/message"
        add_frame "$root/frames" <"$root/message"
        total=$((total + 1))
    done
done

for store in database spool; do
    rm -f "$database"*
    define "$root/kelosyslog.conf" kelo_store $store
    syslog_ng_start "$root"
    send_lines "$root/messages"
    send_frames "$root/frames"
    landed "$total"
    query 'SELECT host, fac, prio, llevel, tag, prog, hex(msg) FROM logs ORDER BY 7, 6, 1' >"$root/$store"
    syslog_ng_stop "$root"
done
diff "$root/database" "$root/spool" || fail "the receiver takes messages apart in another way than syslog-ng"
