# query_module under velhsim as the Linux 2.4 kernel answers it, for the test machine's modules:
# alpha (running, two symbols, uses beta), beta, and sleepy (loaded, not running). The probe
# (sim/tests/probe.cpp) prints ret, then what the buffer holds; sizes are of a 64-bit build.
# QM_INFO (5): the record's size when the buffer is too small, then address, size, flags and use
# count.
$ $PROBE qm alpha 5 0
ret 32
error ENOSPC
$ $PROBE qm alpha 5 64
ret 32
info d0800000 2000 1 3
# QM_SYMBOLS (4): the space needed, then the value and name pairs.
$ $PROBE qm alpha 4 0
ret 107
error ENOSPC
$ $PROBE qm alpha 4 106
ret 107
error ENOSPC
$ $PROBE qm alpha 4 107
ret 2
symbol 0 __insmod_alpha_O/lib/modules/2.4.19/alpha.o_M3D7E1A2B_V132115
symbol c8801000 alpha_export
# A module that is not running shows no symbols; an unknown module or request is refused, and
# the kernel itself (no name) has no information record.
$ $PROBE qm sleepy 4 0
ret 0
$ $PROBE qm nosuch 5 64
ret 0
error ENOENT
$ $PROBE qm alpha 9 64
ret 0
error EINVAL
$ $PROBE qm - 5 64
ret 0
error EINVAL
# QM_MODULES (1), QM_DEPS (2) and QM_REFS (3) list names.
$ $PROBE qm - 1 256
ret 3
name alpha
name beta
name sleepy
$ $PROBE qm - 1 6
ret 18
error ENOSPC
$ $PROBE qm alpha 2 256
ret 1
name beta
$ $PROBE qm beta 3 256
ret 1
name alpha
