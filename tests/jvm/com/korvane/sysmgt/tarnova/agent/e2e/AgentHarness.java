package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;

import com.google.gson.JsonArray;
import com.google.gson.JsonElement;
import com.google.gson.JsonObject;
import com.google.gson.JsonParseException;
import com.google.gson.JsonParser;
import java.io.File;
import java.io.IOException;
import java.io.UncheckedIOException;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.nio.file.StandardCopyOption;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import java.util.concurrent.TimeUnit;
import java.util.stream.Stream;

/**
 * Runs a main class in a fresh JVM that loads the JNI library, the way the agent runs: in an
 * install directory with the log directory beside it, with recording stand-ins for the programs
 * the library starts by name ("slotwatch", "killall") first on the search path. Each run gets a
 * new root: ROOT/bin (the stand-ins, each appending its command line to ROOT/calls/NAME),
 * ROOT/run (install/ and log/) and, with {@link #onMachine}, ROOT/machine, the copy of the machine
 * folder that {@link #editMachine} changes and the simulator (sim/velhsim) runs the JVM on.
 *
 * <p>Needs the system properties velh.build.dir, velh.agent.jar, velh.test.jar and, for machines,
 * velh.machines.dir and velh.data.dir. With velh.i386.java (a 32-bit JVM's java) the agent runs in
 * that JVM under qemu-i386 (velhsim --i386 with a machine), loading the 32-bit library of
 * velh.build.dir, and the simulator comes from the 64-bit build velh.sim.build.dir.
 */
public final class AgentHarness {
    private static final long TIMEOUT_SECONDS = 60;

    private final Path base;
    private final Path buildDir = Path.of(property("velh.build.dir"));
    private String i386Java = System.getProperty("velh.i386.java", "");
    private Path libraryDir = buildDir;
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

    /** A JSON document; a text that is none fails the test with the text shown. */
    public static JsonObject json(String text) {
        try {
            return JsonParser.parseString(text).getAsJsonObject();
        } catch (JsonParseException | IllegalStateException e) {
            throw new AssertionError("not a JSON document: " + text, e);
        }
    }

    /**
     * Checks the systems, busses and slots of a document against the expected ones in
     * tests/jvm/data/NAME, element by element and field by field, leaving out the named fields
     * (those worked out later for a table from a file, such as the bus speeds).
     */
    public static void assertTopology(String name, JsonObject document, String... ignored)
        throws IOException {
        JsonObject expected = json(Files.readString(Path.of(property("velh.data.dir"), name)));
        for (String kind : List.of("systems", "busses", "slots")) {
            JsonArray want = expected.getAsJsonArray(kind);
            JsonArray got = document.getAsJsonArray(kind);
            assertEquals(want.size(), got.size(), () -> kind + ": " + got);
            for (int i = 0; i < want.size(); i++) {
                for (Map.Entry<String, JsonElement> field : want.get(i).getAsJsonObject()
                         .entrySet()) {
                    if (List.of(ignored).contains(field.getKey())) {
                        continue;
                    }
                    assertEquals(field.getValue(), got.get(i).getAsJsonObject().get(field.getKey()),
                        kind + " element " + i + " " + field.getKey());
                }
            }
        }
    }

    /** Creates an empty "../log/jni.log", which switches the JNI-side log on. */
    public AgentHarness withJniLog() {
        jniLog = true;
        return this;
    }

    /** Runs the 64-bit JVM and library of velh.sim.build.dir, to compare a 32-bit run with. */
    public AgentHarness on64Bit() {
        i386Java = "";
        libraryDir = Path.of(property("velh.sim.build.dir"));
        return this;
    }

    /** Runs the JVM under the simulator against a machine folder. */
    public AgentHarness onMachine(Path machineFolder) {
        machine = machineFolder;
        return this;
    }

    /** Changes the run's copy of the machine folder; edits apply in the order given. */
    public AgentHarness editMachine(MachineEdit edit) {
        machineEdits.add(edit);
        return this;
    }

    /** Writes a file into the run's copy of the machine folder (replacing any). */
    public AgentHarness withMachineFile(String relativePath, String content) {
        return editMachine(machine -> Files.writeString(machine.resolve(relativePath), content));
    }

    public AgentHarness withEnvironment(String name, String value) {
        environment.put(name, value);
        return this;
    }

    /** Runs the step interpreter {@link Scenario} with the given steps. */
    public Result scenario(String... steps) {
        return run(Scenario.class.getName(), steps);
    }

    /** Runs the agent's own command line. */
    public Result agent(String... args) {
        return run("com.korvane.sysmgt.tarnova.agent.TarnovaAgent", args);
    }

    private Result run(String mainClass, String... args) {
        try {
            Path root = Files.createTempDirectory(base, "run");
            Path bin = Files.createDirectories(root.resolve("bin"));
            Path calls = Files.createDirectories(root.resolve("calls"));
            for (String program : List.of("slotwatch", "killall")) {
                Files.writeString(bin.resolve(program),
                    "#!/bin/sh\necho \"${0##*/}${*:+ $*}\" >> '" + calls.resolve(program) + "'\n");
                bin.resolve(program).toFile().setExecutable(true);
            }
            Path run = root.resolve("run");
            List<String> command = new ArrayList<>();
            if (machine != null) {
                Path copy = root.resolve("machine");
                copyTree(machine, copy);
                for (MachineEdit edit : machineEdits) {
                    edit.apply(copy);
                }
                setJniLog(copy.resolve("log"));
                String sim = System.getProperty("velh.sim.build.dir", buildDir.toString());
                command.addAll(List.of(Path.of(sim, "sim/velhsim").toString(), "--machine",
                    copy.toString(), "--run-dir", run.toString()));
                command.addAll(i386Java.isEmpty() ? List.of("--") : List.of("--i386", "--"));
            } else {
                Files.createDirectories(run.resolve("install"));
                setJniLog(Files.createDirectories(run.resolve("log")));
                command.addAll(i386Java.isEmpty() ? List.of() : List.of("qemu-i386", "-L", "/"));
            }
            command.add(i386Java.isEmpty()
                ? Path.of(System.getProperty("java.home"), "bin", "java").toString() : i386Java);
            command.addAll(jvmOptions);
            if (!i386Java.isEmpty()) {
                // The interpreter only: under qemu the JIT's code patching across threads now and
                // then trips the JVM's own checks (an internal error in RelocIterator).
                command.add("-Xint");
            }
            command.addAll(List.of("-Djava.library.path=" + libraryDir, "-cp",
                property("velh.agent.jar") + File.pathSeparator + property("velh.test.jar"),
                mainClass));
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
                throw new IllegalStateException("the JVM did not end within " + timeout + " s: "
                    + command);
            }
            return new Result(root, run, process.exitValue());
        } catch (IOException e) {
            throw new UncheckedIOException(e);
        } catch (InterruptedException e) {
            Thread.currentThread().interrupt();
            throw new IllegalStateException("interrupted", e);
        }
    }

    private void setJniLog(Path logDir) throws IOException {
        Path log = logDir.resolve("jni.log");
        Files.deleteIfExists(log);
        if (jniLog) {
            Files.createFile(log);
        }
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
        public final Path root;
        /** The run folder: install/ and log/, and under the simulator the machine's files. */
        public final Path runDir;
        public final int exitCode;
        public final String stdout;
        public final String stderr;

        Result(Path root, Path run, int exitCode) {
            this.root = root;
            this.runDir = run;
            this.exitCode = exitCode;
            this.stdout = read(root.resolve("stdout"));
            this.stderr = read(root.resolve("stderr"));
        }

        /** The JNI-side log, or null when there is no such file. */
        public String jniLog() {
            return read(runDir.resolve("log/jni.log"));
        }

        /** The hardware-information log, or null when there is no such file. */
        public String hwLog() {
            return read(runDir.resolve("log/velhslot.slotmgr.hwinfo.log"));
        }

        /** The JSON document that the agent's --json printed. */
        public JsonObject document() {
            return json(stdout);
        }

        /** The requests that the emulated slot driver received, one line each. */
        public List<String> driverRequests() {
            return lines(runDir.resolve("driver/requests.log"));
        }

        /**
         * The runs of a stand-in, one line each: its name and arguments. The programs run
         * detached and may end after the JVM, so this waits until at least {@code atLeast} runs
         * are recorded (or 10 s) and a little longer for any further run.
         */
        public List<String> calls(String program, int atLeast) {
            Path record = root.resolve("calls").resolve(program);
            long deadline = System.currentTimeMillis() + 10_000;
            try {
                while (lines(record).size() < atLeast && System.currentTimeMillis() < deadline) {
                    Thread.sleep(20);
                }
                Thread.sleep(300);
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
            String text = read(file);
            return text == null || text.isEmpty() ? List.of() : List.of(text.split("\n"));
        }

        private static String read(Path file) {
            try {
                // Decoded leniently: a log is checked, not trusted to be valid text.
                return Files.exists(file)
                    ? new String(Files.readAllBytes(file), StandardCharsets.UTF_8) : null;
            } catch (IOException e) {
                throw new UncheckedIOException(e);
            }
        }
    }
}
