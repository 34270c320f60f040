package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertTrue;

import com.google.gson.JsonElement;
import com.google.gson.JsonObject;
import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.List;
import java.util.concurrent.CompletableFuture;
import java.util.stream.Collectors;
import java.util.stream.IntStream;
import java.util.stream.Stream;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** The agent under the simulator, on the sample machine with a slot driver and a table. */
class MachineTest {
    @TempDir
    Path temp;

    private AgentHarness harness() {
        return new AgentHarness(temp).onMachine(AgentHarness.sampleMachine("chassis-drawer"));
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
        List<String> seen = new ArrayList<>();
        for (JsonElement element : result.document().getAsJsonArray("adapters")) {
            JsonObject adapter = element.getAsJsonObject();
            if (List.of(6L, 9L, 12L).contains(adapter.get("SlotID").getAsLong())) {
                seen.add(Stream.of("Name", "SlotID", "AdapterID", "BusID", "Device", "HasBridge",
                    "IsBootDev", "PciId", "Driver").map(key -> adapter.get(key).getAsString())
                    .collect(Collectors.joining("|")));
            }
        }
        assertEquals(List.of("KSP-2 Service Processor|9|28|6|2|0|0|100251597e5203c100|ksp2.o",
            "Advanced Micro Devices, Inc. [AMD/ATI] KSP-2 Service Processor|12|27|7|2|0|1"
                + "|100251597e5203c100|",
            "Quad Port 10/100 Ethernet Card|6|14|4|2|1|0|101100260000000005|eepro100.o"), seen);
        assertFalse(result.hwLog().contains("velhadp.crd"), result::hwLog);
    }
}
