package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.*;
import static org.junit.jupiter.api.Assertions.*;

import com.google.gson.*;
import java.io.IOException;
import java.nio.file.*;
import java.util.*;
import java.util.concurrent.CompletableFuture;
import java.util.stream.Collectors;
import java.util.stream.Stream;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/**
 * The agent under the simulator: on the sample machine with a slot driver (what reaches Java,
 * what the driver is asked, what each failing request costs) and on the one whose topology comes
 * from a PCI architecture file named after the firmware's machine type (K320) and model (F1T).
 */
class MachineTest {
    private static final Path DRIVER_MACHINE = AgentHarness.sample("chassis-drawer");
    private static final Path FILE_MACHINE = AgentHarness.sample("file-table");
    private static final String MODEL_FILE = "install/K320F1T.pci";
    private static final String UNAVAILABLE =
        "velhlib, GetHwInfo():  PCI architecture information is unavailable";

    @TempDir
    Path temp;

    private AgentHarness.Result run(Path machine, AgentHarness.Edit edit, String... args) {
        AgentHarness harness = new AgentHarness(temp).onMachine(machine).edit(edit);
        AgentHarness.Result result =
            args[0].startsWith("-") ? harness.agent(args) : harness.scenario(args);
        assertEquals(0, result.exitCode(), result::toString);
        return result;
    }

    private static AgentHarness.Edit copy(Path from, String to) {
        return machine -> Files.copy(from, machine.resolve(to));
    }

    @Test
    void fourRunsSideBySideEachPrintTheDriversTableAsTheMachineDescribesIt() throws Exception {
        // Each JVM is process 2 of its namespace: its perf data file goes to the run's own /tmp.
        List<AgentHarness.Result> results = Stream.generate(() -> CompletableFuture.supplyAsync(
                () -> run(DRIVER_MACHINE, machine -> {}, "--json"),
                command -> new Thread(command).start()))
            .limit(4).collect(Collectors.toList()).stream().map(CompletableFuture::join)
            .collect(Collectors.toList());
        for (AgentHarness.Result result : results) {
            assertEquals(results.get(0).document(), result.document(), result::toString);
            String perfData = "tmp/hsperfdata_" + System.getProperty("user.name");
            assertTrue(Files.isDirectory(result.runDir().resolve(perfData)), result::toString);
        }
        AgentHarness.Result result = results.get(0);
        assertEquals(0, result.document().get("status").getAsLong());
        // Every field, the speeds included: a table from the driver keeps the speeds it states.
        assertTopology("chassis-drawer.json", result.document());
        // The prerequisite check reads the version and, once per library, the table; the
        // acquisition reads the table in two steps; the status query reads the version again.
        assertEquals(List.of("open", "version", "open", "size", "table", "open", "size", "table",
            "open", "version"), result.driverRequests());

        // The card file adds the service processor in empty slot 9 and redescribes the bridged
        // card of slot 6; the special case makes slot 12's graphics controller a boot device.
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

    @Test
    void blinkReachesTheDriverWithTheLow32BitsOfTheSlot() throws Exception {
        AgentHarness.Result result =
            run(DRIVER_MACHINE, machine -> {}, "--blink", "4294967301", "-1");
        assertEquals("5 4294967295\n",
            Files.readString(result.runDir().resolve("driver/blink.log")));
    }

    @Test
    void eachFailingDriverRequestIsLoggedAndCostsOnlyWhatNeedsIt() throws Exception {
        // Per line of driver/fail: the status, the inventories' lengths, the log's error lines,
        // the driver's requests and the blink that reached it, as data/driver-failures.json has.
        Path data = Path.of(property("velh.data.dir"), "driver-failures.json");
        for (JsonElement element : JsonParser.parseString(Files.readString(data)).getAsJsonArray()) {
            JsonObject failure = element.getAsJsonObject();
            String what = failure.toString();
            AgentHarness.Result result = run(DRIVER_MACHINE, machine -> {
                Files.writeString(machine.resolve("install/dbgprint"), "hwdbgprint 0x0\n");
                Files.writeString(machine.resolve("driver/fail"),
                    failure.get("fail").getAsString() + "\n");
            }, "hwinfo", "status", "inventories", "blink:3:1", "exit");
            assertEquals(List.of(failure.get("status").getAsString()), result.values("status"));
            String counts = result.values("inventories").get(0);
            assertTrue(counts.matches(failure.get("inventories").getAsString()), what + counts);
            // Only errors reach the log at level 0: exactly the driver's and the acquisition's.
            List<String> lines = new ArrayList<>();
            failure.getAsJsonArray("log").forEach(line -> lines.add(line.getAsString()));
            String log = result.hwLog();
            assertEquals(lines, log.lines().filter(line -> line.matches(
                ".*(GetDriverVersion|GetAslTable|HwSetBlinkState|GetHwInfo)\\(\\).*"))
                .collect(Collectors.toList()), what);
            if (counts.startsWith("0,")) {
                // Nothing else ran: the error blocks are the whole log, blank lines and all.
                assertEquals(lines.stream()
                    .map(line -> line.startsWith("VELHLIB") ? "\n" + line + "\n\n" : line + "\n")
                    .collect(Collectors.joining()), log, what);
            }
            assertEquals(failure.get("requests").getAsString(),
                String.join(" ", result.driverRequests()), what);
            JsonElement blink = failure.get("blink");
            assertEquals(blink.isJsonNull() ? null : blink.getAsString(),
                read(result.runDir().resolve("driver/blink.log")), what);
        }
    }

    @Test
    void theRawTableTraceShowsTheBufferAndTheSizeTheDriverHandedOut() throws Exception {
        AgentHarness.Result result = run(DRIVER_MACHINE,
            machine -> Files.writeString(machine.resolve("install/dbgprint"), "hwdbgprint 0x1\n"),
            "hwinfo", "exit");
        long compiled = Files.size(result.runDir().resolve("driver/asl.bin"));
        String log = result.hwLog();
        // Once for the prerequisite check, once for the acquisition.
        assertEquals(2, occurrences(log,
            "\nvelhlib, GetAslTable():  Calling VelhSlot driver\n\n"), log);
        assertEquals(2, occurrences(log, "\nGetAslTable(), buffer size: 80016\n"
            + "GetAslTable(), got " + compiled + " bytes from driver\n\n"), log);
        assertEquals(2, occurrences(log, "bytes from driver"), log);
    }

    @Test
    void theFileMachinesTopologyArrivesFromItsFileAndMeetsThePrerequisites() throws Exception {
        AgentHarness.Result result = run(FILE_MACHINE, machine -> {}, "--json");
        // A PCI architecture file stands in for the slot driver among the prerequisites.
        assertEquals(0, result.document().get("status").getAsLong());
        assertTopology("file-table.json", result.document());
        String log = result.hwLog();
        assertTrue(log.contains("GetHwInfo():  getting table from file\n"
            + "GetHwInfo():  using PCI architecture file\n"
            + "GetHwInfo():  storing PCI architecture table\n"), log);
        // Neither the prerequisite check nor the acquisition looked for a driver.
        assertFalse(log.contains("velhpdrv") || log.contains("getting ASL table"), log);
    }

    @Test
    void aFileBeatsTheDriverWhichIsNotAskedForItsTable() throws Exception {
        AgentHarness.Result result = run(DRIVER_MACHINE,
            copy(FILE_MACHINE.resolve(MODEL_FILE), "install/K740C4D.pci"), "json", "blink:3:1");
        JsonObject document = AgentHarness.json(result.values("json").get(0));
        assertEquals(0, document.get("status").getAsLong());
        // The speeds are worked out from this machine's adapters, not the file machine's.
        assertTopology("file-table.json", document, "CurBusSpeed", "InPciXMode");
        // The driver got the blink and nothing else: no version, no size, no table.
        assertEquals(List.of("open", "blink 3 1"), result.driverRequests());
    }

    @Test
    void aFileNamedAfterTypeAndModelBeatsOneNamedAfterTheType() throws Exception {
        AgentHarness.Edit typeFile = copy(DRIVER_MACHINE.resolve("driver/asl.pci"),
            "install/K320.pci");
        assertTopology("file-table.json", run(FILE_MACHINE, typeFile, "--json").document());
        AgentHarness.Result typeOnly = run(FILE_MACHINE, machine -> {
            Files.delete(machine.resolve(MODEL_FILE));
            typeFile.apply(machine);
        }, "--json");
        // The driver machine's topology, with the speeds worked out from the adapters.
        assertTopology("chassis-drawer.json", typeOnly.document(), "CurBusSpeed", "InPciXMode");

        // A file for another model of the type is not this machine's: without a driver there
        // is then no table at all.
        AgentHarness.Result otherModel = run(FILE_MACHINE, machine -> Files.move(
            machine.resolve(MODEL_FILE), machine.resolve("install/K320C4D.pci")), "--json");
        JsonObject none = otherModel.document();
        assertEquals(4, none.get("status").getAsLong(), "no architecture file and no driver");
        for (String kind : List.of("systems", "busses", "slots", "adapters")) {
            assertEquals(new JsonArray(), none.get(kind), kind);
        }
        assertTrue(otherModel.hwLog().contains(UNAVAILABLE + "\n"), otherModel::hwLog);
    }
}
