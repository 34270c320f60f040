package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.occurrences;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertNull;
import static org.junit.jupiter.api.Assertions.assertTrue;

import com.google.gson.JsonArray;
import com.google.gson.JsonObject;
import java.nio.file.Path;
import java.util.List;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** The agent's command line, run as the README runs it, in a fresh JVM each time. */
class CommandLineTest {
    @TempDir
    Path temp;

    private AgentHarness harness() {
        return new AgentHarness(temp);
    }

    @Test
    void jsonIsOneDocumentWithTheVersionTheStatusAndFourArrays() {
        AgentHarness.Result result = harness().withJniLog().agent("--json");
        assertEquals(0, result.exitCode, result::toString);

        JsonObject document = result.document();
        assertEquals(List.of("version", "status", "systems", "busses", "slots", "adapters"),
            List.copyOf(document.keySet()));
        assertEquals("4.20", document.get("version").getAsString());
        long status = document.get("status").getAsLong();
        assertTrue(status >= 0 && status <= 0xFFFFFFFFL);
        for (String kind : List.of("systems", "busses", "slots", "adapters")) {
            assertEquals(new JsonArray(), document.get(kind), kind);
        }

        // The whole lifecycle ran: log, acquisition, inventories, status and shutdown.
        String log = result.jniLog();
        assertTrue(log.startsWith("getDebugFileReady() ...... \n"), log);
        assertTrue(log.contains("getAdapterDriverInv: Beginning \n"), log);
        assertTrue(log.contains("Agent Status=" + Long.toHexString(status) + " \n"), log);
        assertTrue(log.endsWith("JNI: getReadyToExit() Done \n***************************\n\n\n"),
            log);
        assertEquals(List.of("killall slotwatch"), result.calls("killall", 1));
    }

    @Test
    void theReportShowsVersionStatusAndAnEmptyTablePerKind() {
        AgentHarness.Result result = harness().agent();
        assertEquals(0, result.exitCode, result::toString);
        String report = result.stdout;
        assertTrue(report.startsWith("Agent version: 4.20\nStatus: "), report);
        for (String header : List.of("Systems: 0\nSystemID  StringID",
                "Busses: 0\nBusID  BusNum", "Slots: 0\nSlotID  BusID",
                "Adapters: 0\nAdapterID  SlotID")) {
            assertTrue(report.contains(header), header);
        }
        assertEquals(4, occurrences(report, "(none)\n"), report);
    }

    @Test
    void blinkRunsInTheLifecycleAndIsLogged() {
        AgentHarness.Result result = harness().withJniLog().agent("--blink", "4294967301", "1");
        assertEquals(0, result.exitCode, result::toString);
        assertEquals("", result.stdout);
        String log = result.jniLog();
        int blink = log.indexOf("BlinkCmd() slot=5, state=1 \n");
        assertTrue(log.startsWith("getDebugFileReady() ...... \n") && blink > 0
            && log.indexOf("JNI: getReadyToExit() Done") > blink, log);
        assertEquals(List.of("killall slotwatch"), result.calls("killall", 1));
        // Without a slot driver the request fails and says so in the hardware log.
        String hwLog = result.hwLog();
        assertTrue(hwLog != null && hwLog.contains("HwSetBlinkState()"), () -> "log: " + hwLog);
    }

    @Test
    void badArgumentsGiveTheUsageAndExitCode2WithoutTouchingTheLibrary() {
        for (List<String> args : List.of(List.of("--blink", "1"), List.of("--blink", "x", "1"),
                List.of("--blink", "1", "99999999999"), List.of("--json", "extra"),
                List.of("--report"), List.of("json"))) {
            AgentHarness.Result result = harness().withJniLog().agent(args.toArray(new String[0]));
            assertEquals(2, result.exitCode, () -> args + ": " + result);
            assertEquals("", result.stdout, args::toString);
            assertTrue(result.stderr.contains("usage: TarnovaAgent [--json | --blink SLOT STATE]"),
                () -> args + ": " + result.stderr);
            assertEquals("", result.jniLog(), args::toString);
            assertNull(result.hwLog(), args::toString);
        }
    }
}
