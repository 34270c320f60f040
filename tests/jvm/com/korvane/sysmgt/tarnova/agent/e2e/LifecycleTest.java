package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.occurrences;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertNull;
import static org.junit.jupiter.api.Assertions.assertTrue;

import java.nio.file.Path;
import java.util.List;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** The entry points of the library in a real JVM, on a machine without any slot table. */
class LifecycleTest {
    private static final String UNAVAILABLE =
        "velhlib, GetHwInfo():  PCI architecture information is unavailable\n";
    private static final String CLOSING = "slotwatch is stopped \n"
        + "***************************\n"
        + "JNI: getReadyToExit() Done \n"
        + "***************************\n\n\n";
    private static final String EMPTY_INVENTORIES = "0,0,0,0,0,0,0,0";

    @TempDir
    Path temp;

    private AgentHarness harness() {
        return new AgentHarness(temp);
    }

    private static void assertClean(AgentHarness.Result result) {
        assertEquals(0, result.exitCode, result::toString);
        // -Xcheck:jni reports misuse of the JNI (a call with an exception pending, a leak of
        // local references) on standard output.
        assertFalse(result.stdout.contains("WARNING"), result::toString);
        assertFalse(result.stderr.contains("FATAL"), result::toString);
    }

    @Test
    void theJniLogGetsTheLifecycleLinesInOrder() {
        AgentHarness.Result result = harness().withJniLog().scenario(
            "debug", "hwinfo", "version", "status", "inventories", "blink:4294967301:1",
            "blink:4294967295:-1", "exit", "hwinfo", "version");
        assertClean(result);
        long status = Long.parseLong(result.values("status").get(0));

        assertEquals("getDebugFileReady() ...... \n"
                + "\n************************ GetHwInfoReady begining \n"
                + "slotwatch is launched .... \n"
                + "getHwInfoReady: GetHwInfo() done \n"
                + "Agent Version=4.20 \n"
                + "getAgentNumInv: Begining \n"
                + "Agent Status=" + Long.toHexString(status) + " \n"
                + "Bus Numeric Inventory \n"
                + "getSlotNumInv: Beginning \n"
                + "getSystemNumInv: Beginning \n"
                + "getAdapterNumInv: Begining \n"
                + "getSystemNameInv: Begining \n"
                + "getAdapterNameInv: Beginning \n"
                + "getAdapterPCIIDInv: Beginning \n"
                + "getAdapterDriverInv: Beginning \n"
                // Only the low 32 bits of the slot reach the driver and the log.
                + "BlinkCmd() slot=5, state=1 \n"
                + "BlinkCmd() slot=-1, state=-1 \n"
                // After getReadyToExit the log is off.
                + CLOSING,
            result.jniLog());
    }

    @Test
    void theJniLogIsAppendedToAndNeverCreated() {
        AgentHarness.Result withoutFile = harness().scenario("debug", "hwinfo", "version", "exit");
        assertClean(withoutFile);
        assertNull(withoutFile.jniLog());

        AgentHarness.Result twice = harness().withJniLog().scenario("debug", "exit", "debug",
            "debug", "exit");
        assertClean(twice);
        // A log switched on twice is written once per line.
        assertEquals("getDebugFileReady() ...... \n" + CLOSING
                + "getDebugFileReady() ...... \n" + "getDebugFileReady() ...... \n" + CLOSING,
            twice.jniLog());
    }

    @Test
    void theVersionTheStatusAndTheEmptyInventoriesDoNotDependOnTheAcquisition() {
        AgentHarness.Result result = harness().scenario("version", "status", "inventories",
            "hwinfo", "version", "status", "inventories", "hwinfo", "inventories", "exit");
        assertClean(result);
        assertEquals(List.of("4.20", "4.20"), result.values("version"));
        assertEquals(List.of(EMPTY_INVENTORIES, EMPTY_INVENTORIES, EMPTY_INVENTORIES),
            result.values("inventories"));
        // The status is a zero-extended 32-bit code.
        List<String> statuses = result.values("status");
        assertEquals(statuses.get(0), statuses.get(1));
        long status = Long.parseLong(statuses.get(0));
        assertTrue(status >= 0 && status <= 0xFFFFFFFFL, statuses::toString);
        // The acquisition found no table, said so in its own log and nowhere else.
        String hwLog = result.hwLog();
        assertTrue(hwLog != null && hwLog.endsWith(UNAVAILABLE), () -> "log: " + hwLog);
        assertEquals(1, occurrences(hwLog, UNAVAILABLE), "a new log per acquisition");
        assertFalse(result.stdout.contains("unavailable"));
    }

    @Test
    void theMonitorStartsOncePerLibraryAndEveryExitStopsIt() {
        AgentHarness.Result result = harness().withJniLog().scenario("debug", "hwinfo", "hwinfo",
            "exit", "debug", "hwinfo", "exit");
        assertClean(result);
        assertEquals(List.of("slotwatch"), result.calls("slotwatch", 1));
        assertEquals(List.of("killall slotwatch", "killall slotwatch"),
            result.calls("killall", 2));
        String log = result.jniLog();
        assertEquals(1, occurrences(log, "slotwatch is launched"), log);
        assertEquals(3, occurrences(log, "GetHwInfo() done"), log);

        AgentHarness.Result exitsOnly = harness().scenario("exit", "exit", "exit");
        assertClean(exitsOnly);
        assertEquals(3, exitsOnly.calls("killall", 3).size());
        assertEquals(List.of(), exitsOnly.calls("slotwatch", 0));
    }

    @Test
    void finishedChildrenDoNotPileUpAsZombies() {
        String[] steps = new String[24];
        steps[0] = "hwinfo";
        for (int i = 1; i <= 20; i++) {
            steps[i] = "exit";
        }
        steps[21] = "hwinfo";
        // Long enough for every stand-in to have run and ended.
        steps[22] = "sleep:1500";
        steps[23] = "children";
        AgentHarness.Result result = harness().scenario(steps);
        assertClean(result);
        assertEquals(20, result.calls("killall", 20).size());
        assertEquals(List.of("0 zombies=0"), result.values("children"));
    }

    @Test
    void aFailedForkIsNotTakenForALaunchedMonitor() {
        String shim = AgentHarness.property("velh.forkfail.lib");
        AgentHarness.Result retried = harness().withJniLog()
            .withEnvironment("LD_PRELOAD", shim).withEnvironment("VELH_FORK_FAILURES", "1")
            .scenario("debug", "hwinfo", "hwinfo", "hwinfo", "exit");
        assertClean(retried);
        String banner = "\n************************ GetHwInfoReady begining \n";
        String done = "getHwInfoReady: GetHwInfo() done \n";
        assertEquals("getDebugFileReady() ...... \n"
                + banner + done
                + banner + "slotwatch is launched .... \n" + done
                + banner + done
                + CLOSING,
            retried.jniLog());
        assertEquals(List.of("slotwatch"), retried.calls("slotwatch", 1));

        AgentHarness.Result none = harness().withJniLog()
            .withEnvironment("LD_PRELOAD", shim).withEnvironment("VELH_FORK_FAILURES", "all")
            .scenario("debug", "hwinfo", "exit");
        assertClean(none);
        assertEquals("getDebugFileReady() ...... \n" + banner + done
                + CLOSING.replace("slotwatch is stopped \n", ""),
            none.jniLog());
        assertEquals(List.of(), none.calls("slotwatch", 0));
        assertEquals(List.of(), none.calls("killall", 0));
    }
}
