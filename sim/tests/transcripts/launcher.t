# velhsim's status and refusals, run outside velhsim in a scratch folder that holds a copy of the
# test machine (machine): the command's status, 128 plus the signal that ended it, 127 for a
# command not found, and 125 with a line that says why for velhsim's own failures, when nothing
# runs.
$ $VELHSIM --machine machine --run-dir a -- sh -c 'exit 7'; echo $?
7
$ $VELHSIM --machine machine --run-dir b -- sh -c 'kill -9 $$'; echo $?
137
$ $VELHSIM --machine machine --run-dir c -- velhsim-no-such-cmd 2>&1; echo $?
velhsim: cannot run velhsim-no-such-cmd: No such file or directory
127
$ mkdir -p used/something; $VELHSIM --machine machine --run-dir used -- touch $PWD/ran 2>&1; echo $?
velhsim: the run folder SCRATCH/used is not a new or empty folder
125
$ $VELHSIM --machine machine --run-dir machine/run -- touch $PWD/ran 2>&1; echo $?
velhsim: the run folder SCRATCH/machine/run lies inside the machine folder SCRATCH/machine
125
$ $VELHSIM --machine none -- touch $PWD/ran 2>&1; echo $?
velhsim: no machine folder SCRATCH/none
125
$ $VELHSIM --machine machine 2>&1; echo $?
velhsim: a machine folder and a command are needed
usage: velhsim [--i386] --machine DIR [--run-dir RUN] -- COMMAND [ARG...]
       velhsim --clean | --help
Copies the machine folder DIR into the run folder RUN (a new temporary folder when not
given) and runs COMMAND in RUN/install against that machine; with --i386, a 32-bit
COMMAND under qemu-i386. --clean removes the temporary run folders (velhsim.*) that
earlier runs left in $TMPDIR or /tmp.
125
# A user namespace of the test's own in which no mount namespace may be made.
$ unshare --user --map-root-user sh -c 'echo 0 > /proc/sys/user/max_mnt_namespaces && exec "$@"' sh $VELHSIM --machine machine --run-dir d -- touch $PWD/ran 2>&1; echo $?
velhsim: cannot create a private mount namespace: No space left on device (a namespace limit has been reached (user.max_user_namespaces or user.max_mnt_namespaces))
125
# Its help; a machine that cannot be copied, where the failure names the file; and --clean,
# which removes velhsim's own run folders, but for one in use, and nothing else.
$ $VELHSIM --help; echo $?
usage: velhsim [--i386] --machine DIR [--run-dir RUN] -- COMMAND [ARG...]
       velhsim --clean | --help
Copies the machine folder DIR into the run folder RUN (a new temporary folder when not
given) and runs COMMAND in RUN/install against that machine; with --i386, a 32-bit
COMMAND under qemu-i386. --clean removes the temporary run folders (velhsim.*) that
earlier runs left in $TMPDIR or /tmp.
0
$ mkdir m2 && mkfifo m2/pipe && $VELHSIM --machine m2 --run-dir e -- true 2>&1; echo $?
velhsim: cannot copy SCRATCH/m2/pipe to SCRATCH/e/pipe: not a file, folder or symbolic link
125
$ mkdir -p t/velhsim.x1/install/sub t/velhsim.x3 t/kept && touch t/velhsim.x2 && chmod 555 t/velhsim.x1/install && (cd t/velhsim.x3 && sleep 5 & sleep 1; TMPDIR=$PWD/t $VELHSIM --clean); echo $?; ls t
velhsim: removed SCRATCH/t/velhsim.x1
0
kept
velhsim.x2
velhsim.x3
$ ls
a
b
c
e
m2
machine
t
used
