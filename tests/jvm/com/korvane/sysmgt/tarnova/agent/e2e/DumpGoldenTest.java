package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;

import java.io.IOException;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.Map;
import java.util.stream.Stream;
import org.junit.jupiter.api.DynamicTest;
import org.junit.jupiter.api.TestFactory;
import org.junit.jupiter.api.io.TempDir;

/**
 * The hardware-information log of one acquisition on the sample machine, for each debug level
 * of the table, equals its expected log in tests/golden (object addresses masked). With
 * VELH_GOLDEN_UPDATE=1 in the environment the logs are written there instead, for review.
 */
class DumpGoldenTest {
    private static final Path SAMPLE = AgentHarness.sampleMachine("chassis-drawer");
    private static final Map<String, String> LEVELS = Map.ofEntries(
        Map.entry("raw-asl", "0x00000001"),
        Map.entry("cooked-asl", "0x00000002"),
        Map.entry("get-adapter", "0x00000004"),
        Map.entry("prereq-check", "0x00001000"),
        Map.entry("systems", "0x00020000"),
        Map.entry("busses", "0x00040000"),
        Map.entry("slots", "0x00080000"),
        Map.entry("slot-adapters", "0x00100000"),
        Map.entry("onboard-adapters", "0x00200000"),
        Map.entry("deleted-adapters", "0x00400000"),
        Map.entry("adapter-cfg-space", "0x00b00000"),
        Map.entry("agent-stats", "0x01000000"),
        Map.entry("object-address", "0x003f0000"));

    @TempDir
    Path temp;

    @TestFactory
    Stream<DynamicTest> eachDumpLogsAsExpected() {
        Path golden = Path.of(AgentHarness.property("velh.golden.dir"));
        boolean update = "1".equals(System.getenv("VELH_GOLDEN_UPDATE"));
        return LEVELS.entrySet().stream().sorted(Map.Entry.comparingByKey())
            .map(level -> DynamicTest.dynamicTest(level.getKey(), () -> {
                AgentHarness.Result result = new AgentHarness(temp).onMachine(SAMPLE)
                    .withMachineFile("install/dbgprint", "hwdbgprint " + level.getValue() + "\n")
                    .scenario("hwinfo", "exit");
                assertEquals(0, result.exitCode, result::toString);
                // A level under which nothing is written leaves no log at all.
                String log = (result.hwLog() == null ? "" : result.hwLog()).replaceAll(" at 0x[0-9a-f]{8}:", " at 0xADDRESS:");
                Path expected = golden.resolve(level.getKey() + ".log");
                if (update) {
                    Files.writeString(expected, log, StandardCharsets.UTF_8);
                }
                assertEquals(read(expected), log, level.getKey());
            }));
    }

    private static String read(Path file) throws IOException {
        return Files.exists(file) ? Files.readString(file, StandardCharsets.UTF_8) : "(missing)";
    }
}
