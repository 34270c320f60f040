package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.*;
import static org.junit.jupiter.api.Assertions.*;

import com.google.gson.*;
import java.nio.file.*;
import java.util.*;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.CsvSource;

/** The library's entry points and the agent's command line, in a JVM, without a slot table. */
class AgentTest {
    private static final String DEBUG = "getDebugFileReady() ...... \n";
    private static final String CLOSING = "slotwatch is stopped \n***************************\n"
        + "JNI: getReadyToExit() Done \n***************************\n\n\n";
    private static final String UNAVAILABLE =
        "velhlib, GetHwInfo():  PCI architecture information is unavailable\n";

    @TempDir
    Path temp;

    /** A run that ended well; -Xcheck:jni reports misuse of the JNI on standard output. */
    private static AgentHarness.Result clean(AgentHarness.Result result) {
        assertEquals(0, result.exitCode(), result::toString);
        assertFalse(result.stdout().contains("WARNING") || result.stderr().contains("FATAL"),
            result::toString);
        return result;
    }

    /**
     * The JNI log equals data/jni-NAME.log, its status the one the steps got; the monitor was
     * started and stopped as often as given. FORK_FAILURES makes that many fork() calls fail.
     */
    @ParameterizedTest
    @CsvSource({"lifecycle, 0, 1, 1, debug hwinfo version status inventories blink:4294967301:1 "
            + "blink:4294967295:-1 exit hwinfo version",
        "twice, 0, 0, 2, debug exit debug debug exit",
        "relaunch, 0, 1, 2, debug hwinfo hwinfo exit debug hwinfo exit",
        "fork-retried, 1, 1, 1, debug hwinfo hwinfo hwinfo exit",
        "fork-failed, 1000000, 0, 0, debug hwinfo hwinfo hwinfo exit"})
    void theJniLogTellsTheLifecycle(String name, String forkFailures, int launches, int stops,
        String steps) throws Exception {
        AgentHarness.Result result = clean(new AgentHarness(temp).withJniLog()
            .env("LD_PRELOAD", property("velh.forkfail.lib"))
            .env("VELH_FORK_FAILURES", forkFailures).scenario(steps.split(" ")));
        String status = result.values("status").stream().findFirst().orElse("-1");
        assertGolden(Path.of(property("velh.data.dir"), "jni-" + name + ".log"), result.jniLog()
            .replace("Status=" + Long.toHexString(Long.parseLong(status)) + " ", "Status=STATUS "));
        assertEquals(Collections.nCopies(launches, "slotwatch"), result.calls("slotwatch", launches));
        assertEquals(Collections.nCopies(stops, "killall slotwatch"), result.calls("killall", stops));
    }

    @Test
    void theVersionTheStatusAndTheEmptyInventoriesDoNotDependOnTheAcquisition() {
        AgentHarness.Result result = clean(new AgentHarness(temp).scenario("version", "status",
            "inventories", "hwinfo", "version", "status", "inventories", "hwinfo", "inventories",
            "exit"));
        assertNull(result.jniLog(), "a JNI log is never created");
        assertEquals(List.of("4.20", "4.20"), result.values("version"));
        assertEquals(Collections.nCopies(3, "0,0,0,0,0,0,0,0"), result.values("inventories"));
        // The status is a zero-extended 32-bit code.
        List<String> statuses = result.values("status");
        assertEquals(statuses.get(0), statuses.get(1));
        long status = Long.parseLong(statuses.get(0));
        assertTrue(status >= 0 && status <= 0xFFFFFFFFL, statuses::toString);
        // The acquisition found no table and said so in a new log of its own, nowhere else.
        String hwLog = result.hwLog();
        assertTrue(hwLog.endsWith(UNAVAILABLE) && occurrences(hwLog, UNAVAILABLE) == 1, hwLog);
        assertFalse(result.stdout().contains("unavailable"));
    }

    @Test
    void finishedChildrenDoNotPileUpAsZombies() throws Exception {
        AgentHarness.Result result = clean(new AgentHarness(temp)
            .scenario(("hwinfo " + "exit ".repeat(20) + "hwinfo children").split(" ")));
        assertEquals(20, result.calls("killall", 20).size());
        assertEquals(List.of("0"), result.values("children"));
    }

    @Test
    void theCommandLineRunsTheWholeLifecycle() throws Exception {
        AgentHarness.Result json = new AgentHarness(temp).withJniLog().agent("--json");
        JsonObject document = json.document();
        assertEquals(List.of("version", "status", "systems", "busses", "slots", "adapters"),
            List.copyOf(document.keySet()));
        assertEquals("4.20", document.get("version").getAsString());
        for (String kind : List.of("systems", "busses", "slots", "adapters")) {
            assertEquals(new JsonArray(), document.get(kind), kind);
        }
        String status = Long.toHexString(document.get("status").getAsLong());
        AgentHarness.Result blink =
            new AgentHarness(temp).withJniLog().agent("--blink", "4294967301", "1");
        for (AgentHarness.Result result : List.of(json, blink)) {
            String log = result.jniLog();
            String last = result == json ? "Agent Status=" + status : "BlinkCmd() slot=5, state=1";
            assertTrue(result.exitCode() == 0 && log.startsWith(DEBUG)
                    && log.contains(result == json ? "getAdapterDriverInv: Beginning \n" : "")
                    && log.endsWith(last + " \n" + CLOSING), result + log);
            assertEquals(List.of("killall slotwatch"), result.calls("killall", 1));
        }
        assertEquals("", blink.stdout());
        // Without a slot driver the request fails and says so in the hardware log.
        assertTrue(blink.hwLog().contains("HwSetBlinkState()"), blink::hwLog);

        assertGolden(Path.of(property("velh.data.dir"), "empty.report"),
            new AgentHarness(temp).agent().stdout().replaceFirst("Status: .*", "Status: STATUS"));
    }

    @Test
    void badArgumentsGiveTheUsageAndExitCode2WithoutTouchingTheLibrary() {
        for (String args : List.of("--blink 1", "--blink x 1", "--blink 1 99999999999",
                 "--json extra", "--report", "json")) {
            AgentHarness.Result result = new AgentHarness(temp).withJniLog().agent(args.split(" "));
            assertEquals(2, result.exitCode(), () -> args + ": " + result);
            assertEquals("", result.stdout() + result.jniLog(), args);
            assertTrue(result.stderr().contains("usage: TarnovaAgent [--json | --blink SLOT STATE]"),
                () -> args + ": " + result.stderr());
            assertNull(result.hwLog(), args);
        }
    }
}
