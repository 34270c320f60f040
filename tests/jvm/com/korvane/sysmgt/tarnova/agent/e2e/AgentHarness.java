package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.*;

import java.io.File;
import java.io.IOException;
import java.nio.charset.StandardCharsets;
import java.nio.file.*;
import java.util.*;
import java.util.concurrent.TimeUnit;

/**
 * Runs a main class in a fresh JVM that loads the JNI library: in ROOT/run (install/, log/), with
 * recording stand-ins (ROOT/calls/NAME) for "slotwatch" and "killall" first on the path and, with
 * {@link #onMachine}, under the simulator on a copy of the machine folder. With velh.i386.java the
 * JVM is that 32-bit one under qemu-i386, the simulator that of the build velh.sim.build.dir.
 */
final class AgentHarness {
    private static final String I386_JAVA = System.getProperty("velh.i386.java", "");
    private final Path base;
    private boolean jniLog;
    private Path machine;
    private String edit = "";
    private final Map<String, String> environment = new HashMap<>();

    AgentHarness(Path base) { this.base = base; }
    static String property(String name) { return Path.of(System.getProperty(name)).toString(); }
    static Path sample(String name) { return Path.of(property("velh.machines.dir"), name); }
    static Path data(String name) { return Path.of(property("velh.data.dir"), name); }

    static void copyTree(Path from, Path to) throws IOException, InterruptedException {
        assertEquals(0, new ProcessBuilder("cp", "-rT", "--preserve=mode", from.toString(),
            to.toString()).inheritIO().start().waitFor());
    }

    /** Equal to the file, or with VELH_GOLDEN_UPDATE=1 written to it instead, for review. */
    static void assertGolden(Path expected, String actual) throws IOException {
        if ("1".equals(System.getenv("VELH_GOLDEN_UPDATE"))) {
            Files.createDirectories(expected.getParent());
            Files.writeString(expected, actual);
        }
        assertEquals(Objects.requireNonNullElse(read(expected), "(missing)"), actual,
            expected::toString);
    }

    /** A file's text, decoded leniently (a log is checked, not trusted), or null without one. */
    static String read(Path file) throws IOException {
        return Files.exists(file) ? new String(Files.readAllBytes(file), StandardCharsets.UTF_8)
                                  : null;
    }

    /** Creates an empty "../log/jni.log", which switches the JNI-side log on. */
    AgentHarness withJniLog() { jniLog = true; return this; }
    AgentHarness onMachine(Path folder) { machine = folder; return this; }
    /** A shell command run in the machine's copy; $SAMPLES is the folder of the samples. */
    AgentHarness edit(String command) { edit = command; return this; }

    /** Makes the first COUNT fork() calls fail as they fail when the process table is full. */
    AgentHarness forkFailures(String count) {
        environment.putAll(
            Map.of("LD_PRELOAD", property("velh.forkfail.lib"), "VELH_FORK_FAILURES", count));
        return this;
    }

    Result agent(String... args) {
        return run("com.korvane.sysmgt.tarnova.agent.TarnovaAgent", args);
    }

    /** Split at spaces: the agent's arguments if empty or "-" first, else the steps. */
    Result run(String line) {
        String[] args = line.isEmpty() ? new String[0] : line.split(" ");
        return line.matches("-.*|") ? agent(args) : run(Scenario.class.getName(), args);
    }

    private Result run(String mainClass, String... args) {
        try {
            Path root = Files.createTempDirectory(base, "run");
            Path bin = Files.createDirectories(root.resolve("bin"));
            for (String program : List.of("slotwatch", "killall")) {
                Files.writeString(bin.resolve(program), "#!/bin/sh\necho \"${0##*/}${*:+ $*}\" >>'"
                    + root.resolve("calls-" + program) + "'\n");
                bin.resolve(program).toFile().setExecutable(true);
            }
            Path run = root.resolve("run");
            Path logDir = run.resolve("log");
            boolean i386 = !I386_JAVA.isEmpty();
            List<String> command = new ArrayList<>();
            if (machine != null) {
                Path copy = root.resolve("machine");
                copyTree(machine, copy);
                ProcessBuilder shell =
                    new ProcessBuilder("sh", "-ec", edit).inheritIO().directory(copy.toFile());
                shell.environment().put("SAMPLES", property("velh.machines.dir"));
                assertEquals(0, shell.start().waitFor(), edit);
                logDir = copy.resolve("log");
                String sim = System.getProperty("velh.sim.build.dir", property("velh.build.dir"));
                command.addAll(List.of(sim + "/sim/velhsim", "--machine", copy.toString(),
                    "--run-dir", run.toString(), i386 ? "--i386" : "--"));
                command.addAll(i386 ? List.of("--") : List.of());
            } else {
                Files.createDirectories(run.resolve("install"));
                Files.createDirectories(logDir);
                command.addAll(i386 ? List.of("qemu-i386", "-L", "/") : List.of());
            }
            Files.deleteIfExists(logDir.resolve("jni.log"));
            if (jniLog) {
                Files.createFile(logDir.resolve("jni.log"));
            }
            command.add(i386 ? I386_JAVA : System.getProperty("java.home") + "/bin/java");
            // Under qemu only the interpreter: the JIT's code patching across threads now and
            // then trips the JVM's own checks.
            command.addAll(i386 ? List.of("-Xcheck:jni", "-Xint") : List.of("-Xcheck:jni"));
            command.addAll(List.of("-Djava.library.path=" + property("velh.build.dir"), "-cp",
                property("velh.agent.jar") + File.pathSeparator + property("velh.test.jar"),
                mainClass));
            command.addAll(List.of(args));
            ProcessBuilder builder = new ProcessBuilder(command)
                .redirectOutput(root.resolve("stdout").toFile())
                .redirectError(root.resolve("stderr").toFile())
                .redirectInput(new File("/dev/null"))
                // Under the simulator the install directory exists only once the launcher made it.
                .directory(machine != null ? root.toFile() : run.resolve("install").toFile());
            builder.environment().merge("PATH", bin.toString(), (path, ours) -> ours + ":" + path);
            builder.environment().putAll(environment);
            Process process = builder.start();
            if (!process.waitFor(i386 ? 300 : 60, TimeUnit.SECONDS)) {
                process.destroyForcibly().waitFor();
                throw new IllegalStateException("no end in time: " + command);
            }
            return new Result(root, run, process.exitValue(), read(root.resolve("stdout")),
                read(root.resolve("stderr")));
        } catch (IOException | InterruptedException e) {
            throw new IllegalStateException(e);
        }
    }

    /** What a run left behind; runDir holds install/, log/ and the machine's files. */
    record Result(Path root, Path runDir, int exitCode, String stdout, String stderr) {
        String file(String path) throws IOException { return read(runDir.resolve(path)); }
        String jniLog() throws IOException { return file("log/jni.log"); }
        String hwLog() throws IOException { return file("log/velhslot.slotmgr.hwinfo.log"); }

        /** The runs of a stand-in, which may end after the JVM: waits for atLeast, then 0.3 s. */
        List<String> calls(String program, int atLeast) throws Exception {
            Path record = root.resolve("calls-" + program);
            for (int i = 0; i < 500 && Objects.toString(read(record), "").lines().count() < atLeast;
                 i++) {
                Thread.sleep(20);
            }
            Thread.sleep(300);
            return Objects.toString(read(record), "").lines().toList();
        }

        @Override
        public String toString() {
            return "exit " + exitCode + "\n--- stdout\n" + stdout + "--- stderr\n" + stderr;
        }
    }
}
