# The machine builders as their tools run them: mkpcitree writes /proc/bus/pci from an
# lspci -xxx -vv -k dump, mkdevmem the memory image from a firmware description, pci2asl the
# slot driver's table from a PCI architecture file. Errors name the line they refuse.
$ pcitree() { rm -rf pci; printf "$1" > dump; $MKPCITREE dump pci 2>&1; }
# The IRQ the kernel routed wins over the configuration's line; the upper half of a 64-bit base
# address takes no slot; the ROM shows without its flag bits; the files hold exactly the dumped
# bytes, in a folder per bus and domain.
$ pcitree '# captured\n0000:02:1f.3 SCSI storage controller: Example\n\tFlags: bus master, 66MHz, medium devsel, latency 64, IRQ 24\n\tRegion 0: Memory at fe000000 (64-bit, prefetchable) [size=256M]\n\tRegion 4: I/O ports at 2f00 [disabled] [size=256]\n\tExpansion ROM at fc900000 [disabled] [size=128K]\n\tKernel driver in use: aic7xxx\n\tKernel modules: aic7xxx\n00: 05 90 cf 00 07 00 b0 02 01 00 00 01 10 40 80 00\n10: 0c 00 00 fe 00 00 00 00 00 00 00 00 00 00 00 00\n20: 01 2f 00 00 00 00 00 00 00 00 00 00 05 90 ff ff\n30: 00 00 90 fc dc 00 00 00 00 00 00 00 0b 01 27 19\n40: aa bb\n\n0001:10:1f.7 Other\n00: 86 80 10 10 00\n'
$ find pci | sort; cat pci/devices; od -An -tx1 -j 60 pci/02/1f.3; od -An -tx1 pci/0001:10/1f.7
pci
pci/0001:10
pci/0001:10/1f.7
pci/02
pci/02/1f.3
pci/devices
02fb	900500cf	18	fe00000c	00000000	00000000	00000000	00002f01	00000000	fc900000	10000000	00000000	00000000	00000000	00000100	00000000	00020000	aic7xxx
10ff	80861010	0	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	00000000	
 0b 01 27 19 aa bb
 86 80 10 10 00
# A bridge (header type 1) has its ROM at 0x38, not 0x30; a line without a pin is no interrupt.
$ pcitree '03:02.0 x\n00: 11 10 26 00 00 00 00 00 00 00 00 00 00 00 01 00\n10: 01 00 00 00 10 00 00 00 00 00 00 00 00 00 00 00\n20: 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n30: 55 00 00 00 00 00 00 00 01 00 f0 fe 0a 00 00 00\n'; cat pci/devices
0310	10110026	0	00000001	00000010	00000000	00000000	00000000	00000000	fef00001	00000000	00000000	00000000	00000000	00000000	00000000	00000000	
$ pcitree '00: 86 80\n'
mkpcitree: dump: line 1: configuration bytes before the first function
$ pcitree '00:01.0 x\n10: 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n'
mkpcitree: dump: line 2: row 10: does not continue the bytes at offset 0
$ pcitree '00:01.0 x\n00: 86 80\n10: 00\n'
mkpcitree: dump: line 3: row 10: does not continue the bytes at offset 2
$ pcitree '00:01.0 x\n00: 86 8\n'
mkpcitree: dump: line 2: "8" is not a byte in hexadecimal
$ pcitree '00:01.0 x\n00: 86 zz\n'
mkpcitree: dump: line 2: "zz" is not a byte in hexadecimal
$ pcitree '00:01.0 x\n00: 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n'
mkpcitree: dump: line 2: a row holds 1 to 16 bytes
$ pcitree '00:20.0 x\n'
mkpcitree: dump: line 1: "00:20.0" is neither a function address nor a row of bytes
$ pcitree '00:01.8 x\n'
mkpcitree: dump: line 1: "00:01.8" is neither a function address nor a row of bytes
$ pcitree '00:01.0 x\n00:02.0 y\n00: 00\n'
mkpcitree: dump: line 1: the function has no configuration bytes (dump with lspci -xxx)
$ pcitree '00:01.0 x\n00: 00\n00:01.0 x\n'
mkpcitree: dump: line 3: function 00:01.0 appears twice
$ pcitree '00:01.0 x\n\tRegion 0: Memory [size=12Q]\n00: 00\n'
mkpcitree: dump: line 2: unreadable region size
$ pcitree '\tKernel driver in use: e1000\n'
mkpcitree: dump: line 1: detail line before the first function
$ $MKPCITREE none pci 2>&1
mkpcitree: none: No such file or directory
# A record of 48 bytes: signature, length, the texts padded with blanks, a checksum that makes
# the sum 0; the signature, length and checksum can be given, as for a decoy.
$ devmem() { printf "$1" > firmware; $MKDEVMEM firmware mem 2>&1; }
$ devmem 'record 0\ntype K740\nmodel C4\nbuild-id KVD140AKV\nserial K7D0412\nunique-id 2303A4B5C6D\nrecord 0x40\nsignature XYZ\nlength 0x21\nchecksum 0x7f\n'; od -An -c -j $((0xF0000)) -N 112 mem
 252   U   V   P   D   0  \0  \0  \0  \0  \0  \0  \0   K   V   D
   1   4   0   A   K   V   K   7   D   0   4   1   2   2   3   0
   3   A   4   B   5   C   6   D   K   7   4   0   C   4     020
  \0  \0  \0  \0  \0  \0  \0  \0  \0  \0  \0  \0  \0  \0  \0  \0
 252   U   X   Y   Z   !  \0  \0  \0  \0  \0  \0  \0            
                                                                
                                                             177
# A captured segment, and records in it; the last is cut at the segment's end. The image is
# sparse: only the segment takes space.
$ { printf S; head -c 65534 /dev/zero; printf E; } > bios.bin
$ devmem '# comment\nsegment bios.bin\nrecord 0x100\ntype K740 # the machine type\nmodel "C4 "\nrecord 0xFFE0\ntype 1234\n'; stat -c %s mem; od -An -c -j $((0xEFFFF)) -N 2 mem
1048576
  \0   S
$ od -An -c -j $((0xF0100)) -N 48 mem; od -An -c -j $((0xFFFE0)) -N 32 mem
 252   U   V   P   D   0  \0  \0  \0  \0  \0  \0  \0            
                                                                
                                   K   7   4   0   C   4      \n
 252   U   V   P   D   0  \0  \0  \0  \0  \0  \0  \0            
                                                                
$ test $(($(stat -c %b mem) * 512)) -lt $((0x40000)) && echo sparse
sparse
$ devmem 'type K740\n'
mkdevmem: firmware: line 1: "type" before the first "record" line
$ devmem 'record 0x10000\n'
mkdevmem: firmware: line 1: the record's offset must be a number below 0x10000
# The comment mark of this format is "#", so "//" makes the offset unreadable.
$ devmem '#\nrecord 0xFFE0  // at the end\n'
mkdevmem: firmware: line 2: the record's offset must be a number below 0x10000
$ devmem 'record 0\ntype K7401\n'
mkdevmem: firmware: line 2: type has at most 4 characters
$ devmem 'record 0\nmodel "C4D\n'
mkdevmem: firmware: line 2: unbalanced quote
$ devmem 'record 0\nlength 256\n'
mkdevmem: firmware: line 2: length must be a number from 0 to 255
$ devmem 'record 0\ncolour red\n'
mkdevmem: firmware: line 2: unknown key "colour"
$ printf abc > short.bin; devmem 'segment short.bin\n'
mkdevmem: short.bin: a captured segment holds exactly 65536 bytes
# The table of a small machine; a missing output folder, a stray section or a missing
# [table header] line fail and leave no output, which --lenient keeps.
$ printf '[table header]\nVHSL 1 0 SIM001\n[chassis]\n0 1\n[bus]\n2 0 255 0x10 0 0 7 1 1 1 1 1\n[slot]\n258 2 3 1 0x05 0x7f 0 0 0 1\n[string]\n1 "Sim"\n' > m.pci
$ $PCI2ASL m.pci out/../asl.bin 2>&1; echo $?; $PCI2ASL m.pci asl.bin; echo $?; od -An -tx1 asl.bin
pci2asl: out/../asl.bin: No such file or directory
1
0
 56 48 53 4c 10 01 00 53 49 4d 30 30 31 00 00 00
 86 10 00 00 01 00 00 00 00 00 00 00 00 00 00 00
 81 10 02 00 ff 10 00 00 07 01 01 01 01 01 00 00
 82 10 02 01 02 03 01 05 7f 00 00 00 01 00 00 00
 91 01 53 69 6d 00 a0
$ printf '[table header]\nVHSL 1 0 M\n[busses]\n1 2 3\n' > stray.pci; printf '[bus]\n1\n' > headless.pci
$ $PCI2ASL stray.pci a.bin 2>&1; echo $?; $PCI2ASL --lenient stray.pci b.bin 2>&1; echo $?; stat -c %s b.bin

ParseLine(): unknown parse mode 0

pci2asl: stray.pci: the reader reported the errors above; no output written
1

ParseLine(): unknown parse mode 0

0
17
$ $PCI2ASL headless.pci c.bin 2>&1; echo $?; $PCI2ASL missing.pci d.bin 2>&1; echo $?; $PCI2ASL stray.pci 2>&1; echo $?
pci2asl: headless.pci: no [table header] line with the signature VHSL; no output written
1
pci2asl: missing.pci: No such file or directory
1
usage: pci2asl [--lenient] INPUT.pci OUTPUT.bin
2
$ ls *.bin
asl.bin
b.bin
bios.bin
short.bin
