package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.io.IOException;
import java.nio.file.Files;
import java.util.HashMap;
import java.util.List;
import java.util.Map;
import java.util.stream.Collectors;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** The adapters that the sample machines declare in their card files: inventory and log. */
class CardFileTest {
    @TempDir
    java.nio.file.Path temp;

    private AgentHarness.Result run(String machine) {
        AgentHarness.Result result =
            new AgentHarness(temp).onMachine(AgentHarness.sampleMachine(machine)).agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        return result;
    }

    private static void assertFields(Map<String, Object> expected, Map<?, ?> actual) {
        Map<String, Object> picked = new HashMap<>();
        expected.keySet().forEach(key -> picked.put(key, actual.get(key)));
        assertEquals(expected, picked, actual::toString);
    }

    @Test
    void theDefaultSampleAddsTheServiceProcessorAndRedescribesTheBridgedCard() {
        AgentHarness.Result result = run("chassis-drawer");
        Map<String, Object> document = result.document();
        List<Map<?, ?>> adapters = ((List<?>) document.get("adapters")).stream()
            .map(adapter -> (Map<?, ?>) adapter).collect(Collectors.toList());
        // The empty slot 9 gets the identifier after the 28 discovered functions.
        assertFields(Map.of("AdapterID", 28L, "SlotID", 9L, "BusID", 6L, "Device", 2L,
            "Name", "KSP-2 Service Processor", "PciId", "100251597e5203c100",
            "Driver", "ksp2.o", "OnBoard", 0L), adapters.get(0));
        // Slot 6's card keeps its identifier and takes the record's description.
        List<Map<?, ?>> slot6 = adapters.stream().filter(adapter -> adapter.get("SlotID")
            .equals(6L)).collect(Collectors.toList());
        assertEquals(1, slot6.size(), slot6::toString);
        assertFields(Map.of("AdapterID", 14L, "BusID", 4L, "Device", 2L, "HasBridge", 1L,
            "Name", "Quad Port 10/100 Ethernet Card", "PciId", "101100260000000005",
            "Driver", "eepro100.o", "MaxSpeed", 33L, "OnBoard", 0L), slot6.get(0));
        assertFalse(result.hwLog().contains("velhadp.crd"), result::hwLog);
        // SuSE SLES-8: no slot supports hot plug.
        for (Object slot : (List<?>) document.get("slots")) {
            assertEquals(0L, ((Map<?, ?>) slot).get("SupHotPlug"), slot::toString);
        }
    }

    @Test
    void theMistakesSampleLogsTheBlocksThatItsExpectationsList() throws IOException {
        String expected = Files.readString(
            AgentHarness.sampleMachine("cardfile-mistakes").resolve("EXPECTED.md"));
        String[] parts = expected.substring(expected.indexOf("## Card file"),
            expected.indexOf("## Inventory")).split("```\n");
        assertEquals(5, parts.length, "the parser's and the cross-reference's blocks");
        String log = run("cardfile-mistakes").hwLog();
        for (int i = 1; i < parts.length; i += 2) {
            assertTrue(log.contains(parts[i]), () -> log);
        }
    }
}
