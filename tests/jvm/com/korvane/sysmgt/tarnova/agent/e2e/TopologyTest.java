package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.occurrences;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertNotEquals;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.List;
import java.util.Map;
import java.util.stream.Collectors;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/**
 * The slot topology that the slot driver hands out, on the sample machine: what reaches Java,
 * what the driver is asked, and what each failing request costs.
 */
class TopologyTest {
    private static final Path SAMPLE = AgentHarness.sampleMachine("chassis-drawer");
    private static final String TABLE_SOURCE = "driver/asl.pci";
    private static final String UNAVAILABLE =
        "velhlib, GetHwInfo():  PCI architecture information is unavailable";
    private static final String NO_INVENTORIES = "0,0,0,0,0,0,0,0";

    @TempDir
    Path temp;

    private AgentHarness harness() {
        return new AgentHarness(temp).onMachine(SAMPLE);
    }

    @Test
    void theDriversTableArrivesAsTheMachineDescribesIt() throws IOException {
        PciArchitectureFile table = PciArchitectureFile.read(SAMPLE.resolve(TABLE_SOURCE));
        AgentHarness.Result result = harness().agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        Map<String, Object> document = result.document();
        assertEquals(0L, document.get("status"));
        // Every field, the speeds included: a table from the driver keeps the speeds it states.
        table.assertReported(document);
        // The prerequisite check reads the version and, once per library, the table; the
        // acquisition reads the table in two steps; the status query reads the version again.
        assertEquals(List.of("open", "version", "open", "size", "table", "open", "size", "table",
            "open", "version"), result.driverRequests());
    }

    @Test
    void aSystemNameOf150CharactersArrivesCutTo100() throws IOException {
        StringBuilder text = new StringBuilder();
        for (int i = 0; i < 150; i++) {
            text.append((char) ('A' + i % 26));
        }
        String longName = text.toString();
        AgentHarness.Result result = harness().withJniLog().editMachine(machine -> {
            Path source = machine.resolve(TABLE_SOURCE);
            String original = Files.readString(source);
            String edited = original.replace("\"KS-740 Chassis\"", "\"" + longName + "\"");
            assertNotEquals(original, edited, "the chassis name is in the table source");
            Files.writeString(source, edited);
        }).agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        Map<String, Object> document = result.document();

        PciArchitectureFile table =
            PciArchitectureFile.read(result.machineCopy().resolve(TABLE_SOURCE));
        assertTrue(table.systemNames().contains(longName), table.systemNames()::toString);
        table.assertReported(document);
        List<Object> names = ((List<?>) document.get("systems")).stream()
            .map(system -> ((Map<?, ?>) system).get("Name")).collect(Collectors.toList());
        assertTrue(names.contains(longName.substring(0, 100)), names::toString);
        // The JNI-side log shows the whole name; only the Java string is cut.
        assertTrue(result.jniLog().contains("System Name=" + longName + "\n"), result::jniLog);
    }

    /** One injected driver failure and what it must leave behind. */
    private static final class Failure {
        final String failLine;
        final long status;
        final boolean tableArrives;
        final List<String> logLines;
        final List<String> requests;
        final boolean blinked;

        Failure(String failLine, long status, boolean tableArrives, List<String> logLines,
                List<String> requests, boolean blinked) {
            this.failLine = failLine;
            this.status = status;
            this.tableArrives = tableArrives;
            this.logLines = logLines;
            this.requests = requests;
            this.blinked = blinked;
        }
    }

    /** The head and message of an error line with the system's error number and text. */
    private static String lastErr(String function, String message, int error, String text) {
        return String.format("VELHLIB, %s:  %s (0x%08x):  %s", function, message, error, text);
    }

    private static List<String> concat(List<String> first, List<String> second) {
        List<String> all = new ArrayList<>(first);
        all.addAll(second);
        return all;
    }

    @Test
    void eachFailingDriverRequestIsLoggedAndCostsOnlyWhatNeedsIt() throws IOException {
        PciArchitectureFile table = PciArchitectureFile.read(SAMPLE.resolve(TABLE_SOURCE));
        String noAccess = "Open \"/dev/velhpdrv\" failed";
        // After the acquisition: the status query reads the version, then one blink.
        List<String> statusAndBlink = List.of("open", "version", "open", "blink 3 1");
        List<String> fullRead = List.of("open", "version", "open", "size", "table", "open",
            "size", "table");
        List<Failure> failures = List.of(
            new Failure("open EACCES", 6, false, List.of(
                lastErr("GetDriverVersion()", noAccess, 13, "Permission denied"),
                lastErr("GetAslTable()", noAccess, 13, "Permission denied"),
                UNAVAILABLE,
                lastErr("GetDriverVersion()", noAccess, 13, "Permission denied"),
                lastErr("HwSetBlinkState()", noAccess, 13, "Permission denied")),
                List.of("open", "open", "open", "open"), false),
            // Without a version the prerequisite check does not ask for the table.
            new Failure("version EBUSY", 6, true, List.of(
                lastErr("GetDriverVersion()", "Driver version IOCTL failed", 16,
                    "Device or resource busy"),
                lastErr("GetDriverVersion()", "Driver version IOCTL failed", 16,
                    "Device or resource busy")),
                concat(List.of("open", "version", "open", "size", "table"), statusAndBlink),
                true),
            // The prerequisite check asks once per library, the acquisition once: no retry.
            new Failure("size ENOMEM", 7, false, List.of(
                lastErr("GetAslTable()", "Read table size IOCTL failed", 12,
                    "Cannot allocate memory"),
                lastErr("GetAslTable()", "Read table size IOCTL failed", 12,
                    "Cannot allocate memory"),
                UNAVAILABLE),
                concat(List.of("open", "version", "open", "size", "open", "size"),
                    statusAndBlink),
                true),
            new Failure("table EFAULT", 7, false, List.of(
                lastErr("GetAslTable()", "Read table IOCTL failed", 14, "Bad address"),
                lastErr("GetAslTable()", "Read table IOCTL failed", 14, "Bad address"),
                UNAVAILABLE),
                concat(fullRead, statusAndBlink), true),
            // A fail line without an error number fails with EIO.
            new Failure("blink", 0, true, List.of(
                "velhlib, HwSetBlinkState():  VelhSlot driver call failed (0x00000005):  "
                    + "Input/output error"),
                concat(fullRead, statusAndBlink), false));

        String tableInventories = table.busses().size() + "," + table.slots().size() + ","
            + table.systems().size();
        for (Failure failure : failures) {
            String what = "driver/fail: " + failure.failLine;
            AgentHarness.Result result = harness()
                .withMachineFile("install/dbgprint", "hwdbgprint 0x0\n")
                .withMachineFile("driver/fail", failure.failLine + "\n")
                .scenario("hwinfo", "status", "inventories", "blink:3:1", "exit");
            assertEquals(0, result.exitCode, () -> what + ": " + result);
            assertEquals(List.of(String.valueOf(failure.status)), result.values("status"), what);

            String inventories = result.values("inventories").get(0);
            if (failure.tableArrives) {
                // Busses, slots and systems as the table lists them, a name per system.
                String[] counts = inventories.split(",");
                assertEquals(tableInventories, counts[0] + "," + counts[1] + "," + counts[2],
                    what);
                assertEquals(counts[2], counts[4], what);
            } else {
                assertEquals(NO_INVENTORIES, inventories, what);
            }

            // Only errors reach the log at level 0: exactly the driver's and the acquisition's.
            String log = result.hwLog();
            List<String> driverLines = log.lines()
                .filter(line -> line.matches(".*(GetDriverVersion|GetAslTable|HwSetBlinkState"
                    + "|GetHwInfo)\\(\\).*"))
                .collect(Collectors.toList());
            assertEquals(failure.logLines, driverLines, what);
            if (!failure.tableArrives) {
                // Nothing else ran: the error blocks are the whole log, blank lines and all.
                String expected = failure.logLines.stream()
                    .map(line -> line.startsWith("VELHLIB") ? "\n" + line + "\n\n" : line + "\n")
                    .collect(Collectors.joining());
                assertEquals(expected, log, what);
            }

            assertEquals(failure.requests, result.driverRequests(), what);
            Path blinkLog = result.runDir.resolve("driver/blink.log");
            if (failure.blinked) {
                assertEquals("3 1\n", Files.readString(blinkLog), what);
            } else {
                assertFalse(Files.exists(blinkLog), what);
            }
        }
    }

    @Test
    void theRawTableTraceShowsTheBufferAndTheSizeTheDriverHandedOut() throws IOException {
        PciArchitectureFile table = PciArchitectureFile.read(SAMPLE.resolve(TABLE_SOURCE));
        AgentHarness.Result result = harness()
            .withMachineFile("install/dbgprint", "hwdbgprint 0x1\n")
            .scenario("hwinfo", "exit");
        assertEquals(0, result.exitCode, result::toString);
        long compiled = Files.size(result.runDir.resolve("driver/asl.bin"));
        assertEquals(table.packetSize(), compiled, "the simulator's table is the source's");

        String log = result.hwLog();
        // Once for the prerequisite check, once for the acquisition.
        assertEquals(2, occurrences(log,
            "\nvelhlib, GetAslTable():  Calling VelhSlot driver\n\n"), log);
        assertEquals(2, occurrences(log, "\nGetAslTable(), buffer size: 80016\n"
            + "GetAslTable(), got " + compiled + " bytes from driver\n\n"), log);
        assertEquals(2, occurrences(log, "bytes from driver"), log);
    }
}
