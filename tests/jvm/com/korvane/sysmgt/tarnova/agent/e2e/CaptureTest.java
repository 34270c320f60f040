package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.List;
import java.util.Map;
import java.util.stream.Stream;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** sim/capture: the machine it runs on, written as a machine folder and replayed. */
class CaptureTest {
    private final String buildDir = AgentHarness.property("velh.build.dir");

    @TempDir
    Path temp;

    private void capture(Path folder, String... simulator) throws Exception {
        Files.createDirectories(folder);
        List<String> command = new ArrayList<>(List.of(simulator));
        Path machines = Path.of(AgentHarness.property("velh.machines.dir"));
        command.add(machines.resolveSibling("capture").toString());
        command.add(folder.toString());
        ProcessBuilder builder = new ProcessBuilder(command).directory(temp.toFile())
            .redirectErrorStream(true).redirectOutput(temp.resolve("capture.out").toFile());
        builder.environment().put("VELHSIM_BUILD_DIR", buildDir);
        assertEquals(0, builder.start().waitFor(), () -> read(temp.resolve("capture.out")));
    }

    private Map<String, Object> json(Path machine) {
        AgentHarness.Result result = new AgentHarness(temp).onMachine(machine).agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        return result.document();
    }

    @Test
    void thisMachineReplaysUnderTheSimulator() throws Exception {
        Path here = temp.resolve("here");
        capture(here);
        json(here);
        assertTrue(read(here.resolve("CAPTURED.txt")).contains("captured: kernel release "));
    }

    @Test
    void aSimulatedMachineComesBackWithItsFunctionsDriverAndInventories() throws Exception {
        Path sample = AgentHarness.sampleMachine("chassis-drawer");
        Path copy = temp.resolve("copy");
        Path run = temp.resolve("run");
        capture(copy, buildDir + "/sim/velhsim", "--machine", sample.toString(), "--run-dir",
            run.toString(), "--");
        assertEquals("1.0.0\n", read(copy.resolve("driver/version")));
        try (Stream<Path> files = Stream.concat(Files.walk(run.resolve("proc")),
                 Stream.of(run.resolve("driver/asl.bin"), run.resolve("etc/SuSE-release")))) {
            for (Path file : (Iterable<Path>) files.filter(Files::isRegularFile)::iterator) {
                Path captured = copy.resolve(run.relativize(file).toString());
                assertEquals(-1L, Files.mismatch(file, captured), file::toString);
            }
        }
        // The modules of the sample are not the build machine's, so only the status may differ.
        Map<String, Object> original = json(sample);
        Map<String, Object> replayed = json(copy);
        for (String kind : List.of("systems", "busses", "slots", "adapters")) {
            assertEquals(original.get(kind), replayed.get(kind), kind);
        }
    }

    private static String read(Path file) {
        try {
            return Files.readString(file);
        } catch (java.io.IOException e) {
            return e.toString();
        }
    }
}
