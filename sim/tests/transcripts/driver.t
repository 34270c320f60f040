# The slot driver /dev/velhpdrv under velhsim, met through real calls by the probe
# (sim/tests/probe.cpp). The test machine's table is 40 bytes: "VHSL", then 0 to 35.
$ $PROBE version
version 1.2.3
$ $PROBE table
size 40
table 40 5648534c000102030405060708090a0b0c0d0e0f101112131415161718191a1b1c1d1e1f20212223 next ee
# A buffer one byte short of the table is refused; a larger one gets the table and its size,
# and nothing past the table is written (the byte after it stays ee).
$ $PROBE table 39
size 40
error EINVAL
$ $PROBE table 100
size 40
table 40 5648534c000102030405060708090a0b0c0d0e0f101112131415161718191a1b1c1d1e1f20212223 next ee
$ $PROBE blink 4 1
blink ok
$ $PROBE blink 4294967295 0
blink ok
$ $PROBE ioctl 0x1234
error ENOTTY
# Every request is logged, whether it then succeeds or fails.
$ cat $VELHSIM_RUN/driver/requests.log
open
version
open
size
table
open
size
table
open
size
table
open
blink 4 1
open
blink 4294967295 0
open
ioctl 0x1234
# driver/fail is read at every request: a request it names fails with the errno given by name
# or number, EIO when none or an unknown one is given.
$ fail() { printf '%s\n' "$1" > $VELHSIM_RUN/driver/fail; }
$ fail open; $PROBE open
error EIO
$ fail 'open ENOENT'; $PROBE open
error ENOENT
$ fail 'version # comment'; $PROBE version
error EIO
$ fail 'size EBUSY'; $PROBE table
error EBUSY
$ fail 'table 5'; $PROBE table
size 40
error EIO
$ fail 'blink ENOSUCH'; $PROBE blink 1 1 2>&1
velhsim: RUN/driver/fail: unknown error "ENOSUCH", failing with EIO
error EIO
$ rm $VELHSIM_RUN/driver/fail; $PROBE blink 2 2
blink ok
# Only the blinks carried out reach blink.log.
$ cat $VELHSIM_RUN/driver/blink.log
4 1
4294967295 0
2 2
# Without a version file the version request fails; without the driver folder there is no device.
$ rm $VELHSIM_RUN/driver/version; $PROBE version 2>&1
velhsim: RUN/driver/version: no three version numbers
error EIO
$ rm -r $VELHSIM_RUN/driver; $PROBE open
error ENOENT
