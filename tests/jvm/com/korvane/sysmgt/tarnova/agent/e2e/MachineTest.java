package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.List;
import java.util.Map;
import java.util.concurrent.CompletableFuture;
import java.util.stream.Collectors;
import java.util.stream.IntStream;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** The agent under the simulator, on the sample machine with a slot driver and a table. */
class MachineTest {
    private static final List<String> KINDS = List.of("systems", "busses", "slots", "adapters");

    @TempDir
    Path temp;

    private AgentHarness harness() {
        Path machines = Path.of(AgentHarness.property("velh.machines.dir"));
        return new AgentHarness(temp).onMachine(machines.resolve("chassis-drawer"));
    }

    @Test
    void theJsonDocumentCarriesTheMachinesTopology() {
        AgentHarness.Result result = harness().agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        @SuppressWarnings("unchecked")
        Map<String, Object> document = (Map<String, Object>) MiniJson.parse(result.stdout);
        assertEquals(0L, document.get("status"), "the sample machine meets every prerequisite");
        for (String kind : List.of("systems", "busses", "slots")) {
            assertFalse(((List<?>) document.get(kind)).isEmpty(), kind);
        }
        for (Object system : (List<?>) document.get("systems")) {
            Object name = ((Map<?, ?>) system).get("Name");
            assertTrue(name instanceof String && !((String) name).isEmpty(), system::toString);
        }
        // Every slot sits on a bus of the table.
        List<?> busses = (List<?>) document.get("busses");
        for (Object slot : (List<?>) document.get("slots")) {
            Object busId = ((Map<?, ?>) slot).get("BusID");
            assertTrue(busses.stream().anyMatch(bus -> busId.equals(((Map<?, ?>) bus).get("BusID"))),
                slot::toString);
        }
    }

    @Test
    void fourRunsSideBySideEachPrintOneCleanDocument() {
        // Each JVM is process 2 of its namespace: its perf data file goes to the run's own /tmp.
        List<AgentHarness.Result> results = IntStream.range(0, 4)
            .mapToObj(i -> CompletableFuture.supplyAsync(() -> harness().agent("--json"),
                command -> new Thread(command).start()))
            .collect(Collectors.toList()).stream().map(CompletableFuture::join)
            .collect(Collectors.toList());
        for (AgentHarness.Result result : results) {
            assertEquals(results.get(0).document(), result.document(), result::toString);
            String perfData = "tmp/hsperfdata_" + System.getProperty("user.name");
            assertTrue(Files.isDirectory(result.runDir.resolve(perfData)), result::toString);
        }
    }

    @Test
    void eachAcquisitionRebuildsTheSameInventoriesAndLogsEveryElement() {
        AgentHarness.Result result = harness().withJniLog().scenario("debug", "hwinfo",
            "inventories", "hwinfo", "inventories", "exit");
        assertEquals(0, result.exitCode, result::toString);
        assertFalse(result.stdout.contains("WARNING"), result::toString);
        List<String> lengths = result.values("inventories");
        assertEquals(2, lengths.size(), result::toString);
        assertEquals(lengths.get(0), lengths.get(1));

        int[] counts = List.of(lengths.get(0).split(",")).stream()
            .mapToInt(Integer::parseInt).toArray();
        // Numeric and string inventories of one kind have one element per object.
        assertEquals(counts[2], counts[4], "systems");
        assertEquals(counts[3], counts[5], "adapters");
        assertTrue(counts[0] > 0 && counts[1] > 0 && counts[2] > 0, lengths.get(0));
        long elementLines =
            result.jniLog().lines().filter(line -> line.matches("(\\*-?\\d+)+")).count();
        assertEquals(2L * (counts[0] + counts[1] + counts[2] + counts[3]), elementLines);
    }

    @Test
    void blinkReachesTheDriverWithTheLow32BitsOfTheSlot() throws IOException {
        AgentHarness.Result result = harness().agent("--blink", "4294967301", "-1");
        assertEquals(0, result.exitCode, result::toString);
        assertEquals("5 4294967295\n",
            Files.readString(result.runDir.resolve("driver/blink.log")));
    }

    @Test
    void theCardFileAddsTheServiceProcessorAndRedescribesTheBridgedCard() {
        AgentHarness.Result result = harness().agent("--json");
        // Name, slot, ID, bus, device, bridge, boot, PCI ID and driver of the adapters in the
        // slots the card file names (9 was empty, 6 held the bridge), and of slot 12's graphics
        // controller, which the special case makes a boot device.
        List<String> seen = ((List<?>) result.document().get("adapters")).stream()
            .map(adapter -> (Map<?, ?>) adapter)
            .filter(adapter -> List.of(6L, 9L, 12L).contains(adapter.get("SlotID")))
            .map(adapter -> List.of("Name", "SlotID", "AdapterID", "BusID", "Device",
                "HasBridge", "IsBootDev", "PciId", "Driver").stream()
                .map(key -> String.valueOf(adapter.get(key))).collect(Collectors.joining("|")))
            .collect(Collectors.toList());
        assertEquals(List.of("KSP-2 Service Processor|9|28|6|2|0|0|100251597e5203c100|ksp2.o",
            "Advanced Micro Devices, Inc. [AMD/ATI] KSP-2 Service Processor|12|27|7|2|0|1"
                + "|100251597e5203c100|",
            "Quad Port 10/100 Ethernet Card|6|14|4|2|1|0|101100260000000005|eepro100.o"), seen);
        assertFalse(result.hwLog().contains("velhadp.crd"), result::hwLog);
    }
}
