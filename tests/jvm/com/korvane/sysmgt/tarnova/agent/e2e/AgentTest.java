package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.*;
import static org.junit.jupiter.api.Assertions.*;

import java.nio.file.*;
import java.util.*;
import java.util.regex.*;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.CsvSource;

/** The library's entry points and the agent's command line, in a JVM, without a slot table. */
class AgentTest {
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
     * What the steps (or the command line) printed and the JNI log equal data/jni-NAME.log, with
     * the status that this host gets masked; the monitor was started and stopped as often as
     * given. FORK_FAILURES makes that many fork() calls fail.
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
        "command-json, 0, 1, 1, --json", "command-blink, 0, 1, 1, --blink 4294967301 1"})
    void theJniLogTellsTheLifecycle(String name, String forkFailures, int launches, int stops,
        String steps) throws Exception {
        AgentHarness.Result result = clean(new AgentHarness(temp).withJniLog()
            .env("LD_PRELOAD", property("velh.forkfail.lib"))
            .env("VELH_FORK_FAILURES", forkFailures).run(steps));
        String stdout = result.stdout();
        String log = result.jniLog();
        Matcher status = Pattern.compile("status\"?[=:] ?(\\d+)").matcher(stdout);
        if (status.find()) {
            // A zero-extended 32-bit code.
            long value = Long.parseLong(status.group(1));
            assertTrue(value <= 0xFFFFFFFFL, stdout);
            stdout = stdout.replace(status.group(), status.group().replace(status.group(1), "STATUS"));
            log = log.replace("Status=" + Long.toHexString(value) + " ", "Status=STATUS ");
        }
        assertGolden(data("jni-" + name + ".log"), stdout + "--- jni.log\n" + log);
        assertEquals(Collections.nCopies(launches, "slotwatch"), result.calls("slotwatch", launches));
        assertEquals(Collections.nCopies(stops, "killall slotwatch"), result.calls("killall", stops));
    }

    @Test
    void finishedChildrenDoNotPileUpAsZombies() throws Exception {
        AgentHarness.Result result =
            clean(new AgentHarness(temp).run("hwinfo " + "exit ".repeat(20) + "hwinfo children"));
        assertEquals(20, result.calls("killall", 20).size());
        assertEquals("children=0\n", result.stdout());
    }

    @Test
    void theReportAndBadArgumentsWithTheUsageAndExitCode2() throws Exception {
        AgentHarness.Result report = clean(new AgentHarness(temp).agent());
        assertGolden(data("empty.report"), report.stdout().replaceFirst("Status: .*", "Status: STATUS"));
        assertNull(report.jniLog(), "a JNI log is never created");
        // Without touching the library.
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
