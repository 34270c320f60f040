package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.*;

import java.nio.file.*;
import java.util.*;
import java.util.stream.Stream;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** sim/capture: the machine it runs on, written as a machine folder and replayed. */
class CaptureTest {
    private final String buildDir = AgentHarness.property("velh.build.dir");

    @TempDir
    Path temp;

    private void capture(Path folder, String... simulator) throws Exception {
        List<String> command = new ArrayList<>(List.of(simulator));
        Path machines = Path.of(AgentHarness.property("velh.machines.dir"));
        command.addAll(List.of(machines.resolveSibling("capture").toString(), folder.toString()));
        ProcessBuilder builder = new ProcessBuilder(command).directory(temp.toFile()).inheritIO();
        builder.environment().put("VELHSIM_BUILD_DIR", buildDir);
        assertEquals(0, builder.start().waitFor(), command::toString);
    }

    /** The agent's document on the machine, where it ends with the exit code given. */
    private String json(Path machine, int exit) {
        AgentHarness.Result result = new AgentHarness(temp).onMachine(machine).agent("--json");
        assertEquals(exit, result.exitCode(), result::toString);
        return result.stdout();
    }

    @Test
    void thisMachineReplaysUnderTheSimulator() throws Exception {
        capture(temp.resolve("here"));
        // No slot driver and no architecture file here: no topology.
        json(temp.resolve("here"), 3);
        String captured = Files.readString(temp.resolve("here/CAPTURED.txt"));
        assertTrue(captured.contains("captured: kernel release "), captured);
    }

    @Test
    void aSimulatedMachineComesBackWithItsFunctionsDriverAndInventories() throws Exception {
        Path sample = AgentHarness.sample("chassis-drawer");
        Path copy = Files.createDirectory(temp.resolve("copy"));
        Path run = temp.resolve("run");
        capture(copy, buildDir + "/sim/velhsim", "--machine", sample.toString(), "--run-dir",
            run.toString(), "--");
        assertEquals("1.0.0\n", Files.readString(copy.resolve("driver/version")));
        try (Stream<Path> files = Stream.concat(Files.walk(run.resolve("proc")),
                 Stream.of(run.resolve("driver/asl.bin"), run.resolve("etc/SuSE-release")))) {
            for (Path file : (Iterable<Path>) files.filter(Files::isRegularFile)::iterator) {
                Path captured = copy.resolve(run.relativize(file).toString());
                assertEquals(-1L, Files.mismatch(file, captured), file::toString);
            }
        }
        // Under the simulator the modules are seen by query_module only, and the install folder
        // is no part of a capture: with both, the replay is the sample.
        for (String part : List.of("install", "modules")) {
            AgentHarness.copyTree(sample.resolve(part), copy.resolve(part));
        }
        assertEquals(json(sample, 0), json(copy, 0));
    }
}
