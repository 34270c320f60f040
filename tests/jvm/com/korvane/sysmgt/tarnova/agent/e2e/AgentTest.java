package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.*;
import static org.junit.jupiter.api.Assertions.*;

import com.google.gson.JsonParser;
import com.korvane.sysmgt.tarnova.agent.cli.*;
import java.nio.file.*;
import java.util.*;
import java.util.regex.*;
import java.util.stream.LongStream;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.CsvSource;

/**
 * The library's entry points and the agent's command line, in a JVM, without a slot table; the
 * JSON document and the report of inventories with content, against data/formatting.*.
 */
class AgentTest {
    @TempDir
    Path temp;

    /**
     * What the steps or the command line printed (with any warning of -Xcheck:jni) and the JNI
     * log equal data/jni-NAME.log, the status this host gets masked; the monitor was started and
     * stopped as often as given, with FORK_FAILURES failing fork() calls.
     */
    @ParameterizedTest
    @CsvSource({"lifecycle, 0, 1, 1, debug hwinfo version status inventories blink:4294967301:1 "
            + "blink:4294967295:-1 exit hwinfo version",
        // Without debug the log stays empty; nothing depends on the acquisition.
        "no-debug, 0, 1, 1, version status inventories hwinfo version status inventories hwinfo "
            + "inventories exit",
        "twice, 0, 0, 2, debug exit debug debug exit",
        "relaunch, 0, 1, 2, debug hwinfo hwinfo exit debug hwinfo exit",
        "fork-retried, 1, 1, 1, debug hwinfo hwinfo hwinfo exit",
        "fork-failed, 1000000, 0, 0, debug hwinfo hwinfo hwinfo exit",
        "command-json, 0, 1, 1, --json",
        "version, 0, 0, 0, --version", "help, 0, 0, 0, --help",
        // Finished children do not pile up as zombies.
        "children, 0, 1, 20, hwinfo exit exit exit exit exit exit exit exit exit exit exit exit "
            + "exit exit exit exit exit exit exit exit hwinfo children"})
    void theJniLogTellsTheLifecycle(String name, String forkFailures, int launches, int stops,
        String steps) throws Exception {
        AgentHarness.Result result =
            new AgentHarness(temp).withJniLog().forkFailures(forkFailures).run(steps);
        String stdout = result.stdout() + "--- exit " + result.exitCode() + "\n";
        String log = result.jniLog();
        Matcher status = Pattern.compile("status\"?[=:] ?(\\d+)").matcher(stdout);
        if (status.find()) {
            String value = status.group(1);
            stdout = stdout.replace(status.group(), status.group().replace(value, "STATUS"));
            log = log.replace("Status=" + Long.toHexString(Long.parseLong(value)) + " ",
                "Status=STATUS ");
        }
        assertGolden(data("jni-" + name + ".log"), stdout + "--- jni.log\n" + log);
        assertEquals(Collections.nCopies(launches, "slotwatch"),
            result.calls("slotwatch", launches));
        assertEquals(Collections.nCopies(stops, "killall slotwatch"),
            result.calls("killall", stops));
    }

    @Test
    void theReportAndBadArgumentsWithTheUsageAndExitCode2() throws Exception {
        AgentHarness.Result report = new AgentHarness(temp).agent("--tables");
        assertEquals(3, report.exitCode(), report::toString);
        assertTrue(report.stderr().startsWith("tarnova-agent: no slot topology found: "));
        assertGolden(data("empty.report"),
            report.stdout().replaceFirst("Status: .*", "Status: STATUS"));
        assertNull(report.jniLog(), "a JNI log is never created");
        // Without touching the library.
        for (String args : List.of("--blink 1", "--blink x 1", "--blink 1 4294967296",
                 "--blink 99999999999 1", "--blink 5 -3", "--json extra", "--report", "json",
                 "--prometheus --output", "--prometheus --json x", "--prometheus --output x")) {
            AgentHarness.Result result =
                new AgentHarness(temp).withJniLog().agent(args.split(" "));
            assertEquals(2, result.exitCode(), () -> args + ": " + result);
            assertEquals("", result.stdout() + result.jniLog(), args);
            assertTrue(result.stderr().contains("usage: tarnova-agent [--tables | --json |"),
                () -> args + ": " + result.stderr());
            assertNull(result.hwLog(), args);
        }
    }

    private static final long NONE = 4294967295L;
    private static final String AWKWARD_NAME = "Drawer \"A\"\\1\n\t\u00e9\u20ac\ud83d";

    private static Inventory sample() {
        long[] bus = LongStream.range(100, 112).toArray();
        bus[9] = NONE;
        long[] adapter = LongStream.range(300, 312).toArray();
        adapter[1] = NONE;
        return new Inventory("4.20", 7,
            new InventoryTable("systems", InventoryTable.SYSTEM_FIELDS,
                new long[][] {{0, 1, 0, 255, 1, 4}, {1, 2, 255, 0, NONE, 0}})
                .withText("Name", new String[] {"Chassis", AWKWARD_NAME}),
            new InventoryTable("busses", InventoryTable.BUS_FIELDS, new long[][] {bus}),
            new InventoryTable("slots", InventoryTable.SLOT_FIELDS, new long[0][]),
            new InventoryTable("adapters", InventoryTable.ADAPTER_FIELDS,
                new long[][] {adapter}).withText("Name", new String[] {""})
                .withText("PciId", new String[] {"8086:1229"})
                .withText("Driver", new String[] {"<Unavailable>"}));
    }

    @Test
    void theDocumentAndTheReportOfInventoriesWithContentAreAsExpected() throws Exception {
        String json = JsonWriter.write(sample());
        assertGolden(data("formatting.json"), json);
        assertEquals(AWKWARD_NAME, JsonParser.parseString(json).getAsJsonObject()
            .getAsJsonArray("systems").get(1).getAsJsonObject().get("Name").getAsString());
        assertEquals("\"\\u0001\\u007f\"", JsonWriter.quote("\u0001\u007f"));
        // The name's lone surrogate has no UTF-8 form; its length still sets the column's width.
        assertGolden(data("formatting.report"),
            ReportFormatter.format(sample()).replace(AWKWARD_NAME, "Drawer (awkward)"));
        assertGolden(data("formatting.slots"),
            SlotReport.format(Machine.of(sample())).replace(AWKWARD_NAME, "Drawer (awkward)"));
    }

    @Test
    void anElementOfTheWrongLengthIsRejected() {
        assertThrows(IllegalArgumentException.class, () -> new InventoryTable("busses",
            InventoryTable.BUS_FIELDS, new long[][] {new long[11]}));
        assertThrows(IllegalArgumentException.class, () -> new InventoryTable("busses",
            InventoryTable.BUS_FIELDS, new long[][] {null}));
        assertThrows(IllegalArgumentException.class,
            () -> new InventoryTable("busses", InventoryTable.BUS_FIELDS, null));
    }
}
