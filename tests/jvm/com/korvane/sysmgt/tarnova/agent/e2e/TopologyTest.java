package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.assertTopology;
import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.occurrences;
import static org.junit.jupiter.api.Assertions.assertEquals;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.List;
import java.util.stream.Collectors;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/**
 * The slot topology that the slot driver hands out, on the sample machine: what reaches Java,
 * what the driver is asked, and what each failing request costs.
 */
class TopologyTest {
    private static final Path SAMPLE = AgentHarness.sampleMachine("chassis-drawer");
    private static final String UNAVAILABLE =
        "velhlib, GetHwInfo():  PCI architecture information is unavailable";

    @TempDir
    Path temp;

    private AgentHarness harness() {
        return new AgentHarness(temp).onMachine(SAMPLE);
    }

    @Test
    void theDriversTableArrivesAsTheMachineDescribesIt() throws IOException {
        AgentHarness.Result result = harness().agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        assertEquals(0, result.document().get("status").getAsLong());
        // Every field, the speeds included: a table from the driver keeps the speeds it states.
        assertTopology("chassis-drawer.json", result.document());
        // The prerequisite check reads the version and, once per library, the table; the
        // acquisition reads the table in two steps; the status query reads the version again.
        assertEquals(List.of("open", "version", "open", "size", "table", "open", "size", "table",
            "open", "version"), result.driverRequests());
    }

    /** One injected driver failure and what it must leave behind. */
    private record Failure(String failLine, long status, boolean tableArrives,
                           List<String> logLines, List<String> requests, boolean blinked) {
    }

    /** An error line with the system's error number and text. */
    private static String lastErr(String function, String message, int error, String text) {
        return String.format("VELHLIB, %s:  %s (0x%08x):  %s", function, message, error, text);
    }

    private static List<String> requests(String... lines) {
        // After the acquisition: the status query reads the version, then one blink.
        List<String> all = new ArrayList<>(List.of(lines));
        all.addAll(List.of("open", "version", "open", "blink 3 1"));
        return all;
    }

    @Test
    void eachFailingDriverRequestIsLoggedAndCostsOnlyWhatNeedsIt() throws IOException {
        String noAccess = "Open \"/dev/velhpdrv\" failed";
        String denied = "Permission denied";
        String[] fullRead = {"open", "version", "open", "size", "table", "open", "size", "table"};
        String sizeFailed = lastErr("GetAslTable()", "Read table size IOCTL failed", 12,
            "Cannot allocate memory");
        String tableFailed = lastErr("GetAslTable()", "Read table IOCTL failed", 14,
            "Bad address");
        String versionFailed = lastErr("GetDriverVersion()", "Driver version IOCTL failed", 16,
            "Device or resource busy");
        List<Failure> failures = List.of(
            new Failure("open EACCES", 6, false, List.of(
                lastErr("GetDriverVersion()", noAccess, 13, denied),
                lastErr("GetAslTable()", noAccess, 13, denied), UNAVAILABLE,
                lastErr("GetDriverVersion()", noAccess, 13, denied),
                lastErr("HwSetBlinkState()", noAccess, 13, denied)),
                List.of("open", "open", "open", "open"), false),
            // Without a version the prerequisite check does not ask for the table.
            new Failure("version EBUSY", 6, true, List.of(versionFailed, versionFailed),
                requests("open", "version", "open", "size", "table"), true),
            // The prerequisite check asks once per library, the acquisition once: no retry.
            new Failure("size ENOMEM", 7, false, List.of(sizeFailed, sizeFailed, UNAVAILABLE),
                requests("open", "version", "open", "size", "open", "size"), true),
            new Failure("table EFAULT", 7, false, List.of(tableFailed, tableFailed, UNAVAILABLE),
                requests(fullRead), true),
            // A fail line without an error number fails with EIO.
            new Failure("blink", 0, true, List.of("velhlib, HwSetBlinkState():  VelhSlot driver "
                + "call failed (0x00000005):  Input/output error"), requests(fullRead), false));

        for (Failure failure : failures) {
            String what = "driver/fail: " + failure.failLine();
            AgentHarness.Result result = harness()
                .withMachineFile("install/dbgprint", "hwdbgprint 0x0\n")
                .withMachineFile("driver/fail", failure.failLine() + "\n")
                .scenario("hwinfo", "status", "inventories", "blink:3:1", "exit");
            assertEquals(0, result.exitCode, () -> what + ": " + result);
            assertEquals(List.of(String.valueOf(failure.status())), result.values("status"), what);
            if (!failure.tableArrives()) {
                assertEquals("0,0,0,0,0,0,0,0", result.values("inventories").get(0), what);
            } else {
                // Busses, slots and systems as the table lists them, a name per system.
                String[] counts = result.values("inventories").get(0).split(",");
                assertEquals("7,13,2,2", counts[0] + "," + counts[1] + "," + counts[2] + ","
                    + counts[4], what);
            }

            // Only errors reach the log at level 0: exactly the driver's and the acquisition's.
            String log = result.hwLog();
            assertEquals(failure.logLines(), log.lines()
                .filter(line -> line.matches(
                    ".*(GetDriverVersion|GetAslTable|HwSetBlinkState|GetHwInfo)\\(\\).*"))
                .collect(Collectors.toList()), what);
            if (!failure.tableArrives()) {
                // Nothing else ran: the error blocks are the whole log, blank lines and all.
                assertEquals(failure.logLines().stream()
                    .map(line -> line.startsWith("VELHLIB") ? "\n" + line + "\n\n" : line + "\n")
                    .collect(Collectors.joining()), log, what);
            }
            assertEquals(failure.requests(), result.driverRequests(), what);
            Path blinkLog = result.runDir.resolve("driver/blink.log");
            assertEquals(failure.blinked(), Files.exists(blinkLog), what);
            if (failure.blinked()) {
                assertEquals("3 1\n", Files.readString(blinkLog), what);
            }
        }
    }

    @Test
    void theRawTableTraceShowsTheBufferAndTheSizeTheDriverHandedOut() throws IOException {
        AgentHarness.Result result = harness()
            .withMachineFile("install/dbgprint", "hwdbgprint 0x1\n")
            .scenario("hwinfo", "exit");
        assertEquals(0, result.exitCode, result::toString);
        long compiled = Files.size(result.runDir.resolve("driver/asl.bin"));
        String log = result.hwLog();
        // Once for the prerequisite check, once for the acquisition.
        assertEquals(2, occurrences(log,
            "\nvelhlib, GetAslTable():  Calling VelhSlot driver\n\n"), log);
        assertEquals(2, occurrences(log, "\nGetAslTable(), buffer size: 80016\n"
            + "GetAslTable(), got " + compiled + " bytes from driver\n\n"), log);
        assertEquals(2, occurrences(log, "bytes from driver"), log);
    }
}
