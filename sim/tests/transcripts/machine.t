# What a command sees of the test machine (sim/tests/machine) under velhsim. Its etc/ and
# usr/share/ lie read-only over the real folders, whose other files stay.
$ cat /etc/SuSE-release /etc/sysconfig/kernel
SuSE SLES-8 (i386)
VERSION = 8.1
INITRD_MODULES="alpha"
$ test -s /etc/passwd && echo passwd stays
passwd stays
$ (echo x >> /etc/SuSE-release) 2>/dev/null || echo read-only
read-only
$ cat /usr/share/pci.ids
8086  Intel Corporation
	1229  82557
# /proc/bus/pci built from lspci.txt: the dumped bytes of each function, and the devices list
# with the routed interrupt, the base addresses, the sizes and the driver.
$ ls /proc/bus/pci /proc/bus/pci/02
/proc/bus/pci:
00
02
devices

/proc/bus/pci/02:
1f.3
$ stat -c %s /proc/bus/pci/00/01.0 /proc/bus/pci/02/1f.3; od -An -tx1 -N 4 /proc/bus/pci/00/01.0
64
20
 86 80 29 12
$ cat /proc/bus/pci/devices
0008	80861229	b	f4fff000	00000000	00000000	00000000	00000000	00000000	00000000	00001000	00000000	00000000	00000000	00000000	00000000	00000000	alpha
02fb	80861229	0	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	
# /dev/mem built from firmware: 1 MiB with the record at 0xF1234, its type and model at 40.
$ stat -c %s /dev/mem
1048576
$ od -An -c -j $((0xF1234)) -N 5 /dev/mem
 252   U   V   P   D
$ od -An -c -j $((0xF1234 + 40)) -N 7 /dev/mem
   K   7   4   0   C   4   D
# An entry that has no place in the real folder (dev/velhsim-node, proc/bus/velhsim-extra) has
# the folder rebuilt around it: the real entries stay, devices and links alike.
$ cat /dev/velhsim-node /proc/bus/velhsim-extra
node
extra
$ echo x > /dev/null && head -c 2 /dev/zero | od -An -tx1
 00 00
$ test -L /dev/fd && echo links stay
links stay
# The command starts in the install folder, with the log folder beside it; /tmp is the run's own.
$ pwd; test -d ../log && echo log beside
RUN/install
log beside
$ echo log > ../log/test.log; cat $VELHSIM_RUN/log/test.log
log
$ touch /tmp/velhsim-private; test -e $VELHSIM_RUN/tmp/velhsim-private && echo private tmp
private tmp
# The release that uname reports, read at every call: without the file the real one shows.
$ $PROBE uname; uname -r
release 2.4.19-64GB-SMP
2.4.19-64GB-SMP
$ rm $VELHSIM_RUN/uname; test "$($PROBE uname)" = "release $(cat /proc/sys/kernel/osrelease)" && echo real
real
