package com.korvane.sysmgt.tarnova.agent.e2e;

import java.io.File;
import java.io.IOException;
import java.io.UncheckedIOException;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.nio.file.StandardCopyOption;
import java.nio.file.attribute.PosixFilePermissions;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import java.util.concurrent.TimeUnit;
import java.util.stream.Stream;

/**
 * Runs a main class in a fresh JVM that loads the JNI library, the way the agent runs: the
 * working directory is an install directory with the log directory beside it, and the
 * programs the library starts by name ("slotwatch", "killall") are recording stand-ins first
 * on the search path. Each run gets a new root folder:
 *
 * <pre>
 *   ROOT/bin/      the stand-ins, each appending its name and arguments to ROOT/calls/NAME
 *   ROOT/run/      install/ (the working directory) and log/
 *   ROOT/machine/  with {@link #onMachine}: the copy of the machine folder given to the simulator
 * </pre>
 *
 * With {@link #onMachine} the JVM runs under the simulator (sim/velhsim in the build
 * directory), which copies the machine folder to ROOT/run and runs the JVM in ROOT/run/install.
 * {@link #editMachine} changes the copy first (failure injection, extra install files), so the
 * machine folders in the source tree stay as they are.
 *
 * <p>Needs the system properties velh.build.dir, velh.agent.jar and velh.test.jar, and for
 * {@link #sampleMachine} velh.machines.dir. With velh.i386.java (a 32-bit JVM's java) the agent
 * runs in that JVM under qemu-i386 (velhsim --i386 with a machine), loading the 32-bit library
 * of velh.build.dir, and the simulator comes from the 64-bit build velh.sim.build.dir.
 */
public final class AgentHarness {
    public static final String AGENT_CLASS = "com.korvane.sysmgt.tarnova.agent.TarnovaAgent";
    public static final String SCENARIO_CLASS = Scenario.class.getName();
    private static final long TIMEOUT_SECONDS = 60;

    private final Path base;
    private final Path buildDir = Path.of(property("velh.build.dir"));
    private String i386Java = System.getProperty("velh.i386.java", "");
    private Path libraryDir = buildDir;
    private final String classPath =
        property("velh.agent.jar") + File.pathSeparator + property("velh.test.jar");
    private boolean jniLog;
    private Path machine;
    private final Map<String, String> environment = new LinkedHashMap<>();
    private final List<String> jvmOptions = new ArrayList<>(List.of("-Xcheck:jni"));
    private final List<MachineEdit> machineEdits = new ArrayList<>();

    /** A change to the run's copy of the machine folder, made before the simulator starts. */
    @FunctionalInterface
    public interface MachineEdit {
        void apply(Path machine) throws IOException;
    }

    /** @param base the folder under which every run gets its root (a test's temporary folder) */
    public AgentHarness(Path base) {
        this.base = base;
    }

    static String property(String name) {
        String value = System.getProperty(name);
        if (value == null || value.isEmpty()) {
            throw new IllegalStateException("system property " + name + " is not set");
        }
        return value;
    }

    /** A machine folder of sim/machines. */
    public static Path sampleMachine(String name) {
        return Path.of(property("velh.machines.dir")).resolve(name);
    }

    /** How often part occurs in text. */
    public static int occurrences(String text, String part) {
        int count = 0;
        for (int at = text.indexOf(part); at >= 0; at = text.indexOf(part, at + 1)) {
            count++;
        }
        return count;
    }

    /** Creates an empty "../log/jni.log", which switches the JNI-side log on. */
    public AgentHarness withJniLog() {
        jniLog = true;
        return this;
    }

    /** Runs the JVM under the simulator against a machine folder. */
    public AgentHarness onMachine(Path machineFolder) {
        machine = machineFolder;
        return this;
    }

    /** Runs the 64-bit JVM and library of velh.sim.build.dir, to compare a 32-bit run with. */
    public AgentHarness on64Bit() {
        i386Java = "";
        libraryDir = Path.of(property("velh.sim.build.dir"));
        return this;
    }

    /** Changes the run's copy of the machine folder; edits apply in the order given. */
    public AgentHarness editMachine(MachineEdit edit) {
        machineEdits.add(edit);
        return this;
    }

    /** Writes a file into the run's copy of the machine folder (replacing any). */
    public AgentHarness withMachineFile(String relativePath, String content) {
        return editMachine(machine -> {
            Path file = machine.resolve(relativePath);
            Files.createDirectories(file.getParent());
            Files.writeString(file, content);
        });
    }

    public AgentHarness withEnvironment(String name, String value) {
        environment.put(name, value);
        return this;
    }

    /** Runs the step interpreter {@link Scenario} with the given steps. */
    public Result scenario(String... steps) {
        return run(SCENARIO_CLASS, steps);
    }

    /** Runs the agent's own command line. */
    public Result agent(String... args) {
        return run(AGENT_CLASS, args);
    }

    public Result run(String mainClass, String... args) {
        try {
            return runChecked(mainClass, args);
        } catch (IOException e) {
            throw new UncheckedIOException(e);
        } catch (InterruptedException e) {
            Thread.currentThread().interrupt();
            throw new IllegalStateException("interrupted", e);
        }
    }

    private Result runChecked(String mainClass, String[] args)
        throws IOException, InterruptedException {
        Path root = Files.createTempDirectory(base, "run");
        Path bin = Files.createDirectories(root.resolve("bin"));
        Path calls = Files.createDirectories(root.resolve("calls"));
        for (String program : List.of("slotwatch", "killall")) {
            writeStandIn(bin.resolve(program), calls.resolve(program));
        }
        Path run = root.resolve("run");

        List<String> command = new ArrayList<>();
        if (machine != null) {
            Path machineCopy = root.resolve("machine");
            copyTree(machine, machineCopy);
            for (MachineEdit edit : machineEdits) {
                edit.apply(machineCopy);
            }
            setJniLog(machineCopy.resolve("log"));
            String sim = System.getProperty("velh.sim.build.dir", buildDir.toString());
            command.addAll(List.of(Path.of(sim, "sim/velhsim").toString(), "--machine",
                machineCopy.toString(), "--run-dir", run.toString()));
            command.addAll(i386Java.isEmpty() ? List.of("--") : List.of("--i386", "--"));
        } else {
            Files.createDirectories(run.resolve("install"));
            setJniLog(Files.createDirectories(run.resolve("log")));
            command.addAll(i386Java.isEmpty() ? List.of() : List.of("qemu-i386", "-L", "/"));
        }
        command.add(i386Java.isEmpty()
            ? Path.of(System.getProperty("java.home"), "bin", "java").toString() : i386Java);
        command.addAll(jvmOptions);
        command.add("-Djava.library.path=" + libraryDir);
        command.add("-cp");
        command.add(classPath);
        command.add(mainClass);
        command.addAll(Arrays.asList(args));

        ProcessBuilder builder = new ProcessBuilder(command)
            .redirectOutput(root.resolve("stdout").toFile())
            .redirectError(root.resolve("stderr").toFile())
            .redirectInput(ProcessBuilder.Redirect.from(new File("/dev/null")));
        // Under the simulator the install directory exists only once the launcher made it.
        builder.directory(machine != null ? root.toFile() : run.resolve("install").toFile());
        Map<String, String> env = builder.environment();
        env.put("PATH", bin + File.pathSeparator + env.getOrDefault("PATH", "/usr/bin:/bin"));
        env.putAll(environment);

        Process process = builder.start();
        // qemu runs the 32-bit JVM several times slower.
        long timeout = i386Java.isEmpty() ? TIMEOUT_SECONDS : 5 * TIMEOUT_SECONDS;
        if (!process.waitFor(timeout, TimeUnit.SECONDS)) {
            process.destroyForcibly().waitFor();
            throw new IllegalStateException("the JVM did not end within " + timeout
                + " s: " + String.join(" ", command));
        }
        return new Result(root, run, process.exitValue());
    }

    private void setJniLog(Path logDir) throws IOException {
        Path log = logDir.resolve("jni.log");
        if (jniLog) {
            if (!Files.exists(log)) {
                Files.createFile(log);
            }
        } else {
            Files.deleteIfExists(log);
        }
    }

    private static void writeStandIn(Path script, Path record) throws IOException {
        Files.writeString(script, "#!/bin/sh\n"
            + "line=${0##*/}\n"
            + "for argument in \"$@\"; do line=\"$line $argument\"; done\n"
            + "echo \"$line\" >> '" + record + "'\n");
        Files.setPosixFilePermissions(script, PosixFilePermissions.fromString("rwxr-xr-x"));
    }

    static void copyTree(Path from, Path to) throws IOException {
        try (Stream<Path> paths = Files.walk(from)) {
            for (Path path : (Iterable<Path>) paths::iterator) {
                Path target = to.resolve(from.relativize(path).toString());
                if (Files.isDirectory(path)) {
                    Files.createDirectories(target);
                } else {
                    Files.copy(path, target, StandardCopyOption.COPY_ATTRIBUTES);
                }
            }
        }
    }

    /** What one JVM run left behind. */
    public static final class Result {
        private static final long CALL_WAIT_MILLIS = 10_000;
        private static final long SETTLE_MILLIS = 300;

        public final Path root;
        /** The run folder: install/ and log/, and under the simulator the machine's files. */
        public final Path runDir;
        public final Path installDir;
        public final Path logDir;
        public final int exitCode;
        public final String stdout;
        public final String stderr;

        Result(Path root, Path run, int exitCode) throws IOException {
            this.root = root;
            this.runDir = run;
            this.installDir = run.resolve("install");
            this.logDir = run.resolve("log");
            this.exitCode = exitCode;
            this.stdout = readIfExists(root.resolve("stdout"));
            this.stderr = readIfExists(root.resolve("stderr"));
        }

        /** The JNI-side log, or null when there is no such file. */
        public String jniLog() {
            return readIfExists(logDir.resolve("jni.log"));
        }

        /** The hardware-information log, or null when there is no such file. */
        public String hwLog() {
            return readIfExists(logDir.resolve("velhslot.slotmgr.hwinfo.log"));
        }

        /** The JSON document that the run printed: all of standard output (the agent's --json). */
        public Map<String, Object> document() {
            return document(stdout);
        }

        /** A JSON document of the run; a text that is none fails with the whole run shown. */
        @SuppressWarnings("unchecked")
        public Map<String, Object> document(String json) {
            try {
                return (Map<String, Object>) MiniJson.parse(json);
            } catch (IllegalArgumentException | ClassCastException e) {
                throw new AssertionError("not a JSON document (" + e.getMessage() + "): " + this, e);
            }
        }

        /** The copy of the machine folder that the run was given (null without a machine). */
        public Path machineCopy() {
            Path copy = root.resolve("machine");
            return Files.isDirectory(copy) ? copy : null;
        }

        /**
         * The requests that the emulated slot driver received, one line each ("open",
         * "version", "size", "table", "blink SLOT STATE"); empty when it received none.
         */
        public List<String> driverRequests() {
            return lines(runDir.resolve("driver/requests.log"));
        }

        /**
         * The runs of a stand-in ("slotwatch" or "killall"), one line each: its name and
         * arguments. The programs run detached and may end after the JVM, so this waits until
         * at least {@code atLeast} runs are recorded (or a time-out) and a little longer for
         * any further run.
         */
        public List<String> calls(String program, int atLeast) {
            Path record = root.resolve("calls").resolve(program);
            long deadline = System.currentTimeMillis() + CALL_WAIT_MILLIS;
            try {
                while (lines(record).size() < atLeast && System.currentTimeMillis() < deadline) {
                    Thread.sleep(20);
                }
                Thread.sleep(SETTLE_MILLIS);
            } catch (InterruptedException e) {
                Thread.currentThread().interrupt();
            }
            return lines(record);
        }

        /** The lines that the step interpreter printed for one kind of step ("version=..."). */
        public List<String> values(String key) {
            List<String> values = new ArrayList<>();
            for (String line : stdout.split("\n")) {
                if (line.startsWith(key + "=")) {
                    values.add(line.substring(key.length() + 1));
                }
            }
            return values;
        }

        @Override
        public String toString() {
            return "exit " + exitCode + "\n--- stdout\n" + stdout + "--- stderr\n" + stderr;
        }

        private static List<String> lines(Path file) {
            String text = readIfExists(file);
            return text == null || text.isEmpty() ? List.of() : List.of(text.split("\n"));
        }

        private static String readIfExists(Path file) {
            try {
                // Decoded leniently: a log is checked, not trusted to be valid text.
                return Files.exists(file)
                    ? new String(Files.readAllBytes(file), StandardCharsets.UTF_8)
                    : null;
            } catch (IOException e) {
                throw new UncheckedIOException(e);
            }
        }
    }
}
