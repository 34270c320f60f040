package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.*;

import java.nio.file.*;
import java.util.*;
import java.util.concurrent.*;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.function.Executable;
import org.junit.jupiter.api.io.TempDir;

/**
 * The agent under the simulator on the sample machines, four runs side by side: per case, what it
 * printed, the slot driver's requests, the blink that reached the driver and the hardware log
 * equal data/machine/NAME.txt.
 */
class MachineTest {
    private static final String ERRORS_ONLY = "echo 'hwdbgprint 0x0' >install/dbgprint; echo ";
    private static final String SCENARIO = "hwinfo status inventories blink:3:1 exit";
    private static final String TYPE_FILE =
        "cp $SAMPLES/chassis-drawer/driver/asl.pci install/K320.pci";

    /** Name, sample, shell edit of its copy, then the agent's arguments or the scenario's steps. */
    private static final String[][] CASES = {
        // The driver's table, with the card file's service processor in slot 9 and its
        // redescribed bridged card in slot 6; twice, to run side by side with itself.
        {"chassis-drawer", "chassis-drawer", "", "--json"},
        {"chassis-drawer", "chassis-drawer", "", "--json"},
        {"no-card-file", "chassis-drawer", "rm install/velhadp.crd", "--json"},
        // The driver gets the low 32 bits of the slot.
        {"blink", "chassis-drawer", "", "--blink 4294967301 -1"},
        // A PCI architecture file named after the firmware's machine type (K320) and model (F1T)
        // stands in for the slot driver.
        {"file-table", "file-table", "", "--json"},
        {"file-beats-driver", "chassis-drawer",
            "cp $SAMPLES/file-table/install/K320F1T.pci install/K740C4D.pci", "json blink:3:1"},
        {"model-beats-type", "file-table", TYPE_FILE, "--json"},
        {"type-file", "file-table", "rm install/K320F1T.pci; " + TYPE_FILE, "--json"},
        {"other-model", "file-table", "mv install/K320F1T.pci install/K320C4D.pci", "--json"},
        // Each failing driver request, at the debug level that logs only errors.
        {"fail-open", "chassis-drawer", ERRORS_ONLY + "'open EACCES' >driver/fail", SCENARIO},
        {"fail-version", "chassis-drawer", ERRORS_ONLY + "'version EBUSY' >driver/fail", SCENARIO},
        {"fail-size", "chassis-drawer", ERRORS_ONLY + "'size ENOMEM' >driver/fail", SCENARIO},
        {"fail-table", "chassis-drawer", ERRORS_ONLY + "'table EFAULT' >driver/fail", SCENARIO},
        {"fail-blink", "chassis-drawer", ERRORS_ONLY + "blink >driver/fail", SCENARIO},
    };

    @TempDir
    Path temp;

    private String outcome(String[] test) throws Exception {
        AgentHarness harness =
            new AgentHarness(temp).onMachine(AgentHarness.sample(test[1])).edit(test[2]);
        AgentHarness.Result result = harness.run(test[3]);
        assertEquals(0, result.exitCode(), result::toString);
        // Each JVM is process 2 of its namespace: its perf data file goes to the run's own /tmp.
        String perfData = "tmp/hsperfdata_" + System.getProperty("user.name");
        assertTrue(Files.isDirectory(result.runDir().resolve(perfData)), result::toString);
        return result.stdout() + "--- driver requests\n"
            + Objects.toString(result.file("driver/requests.log"), "") + "--- driver blink\n"
            + Objects.toString(result.file("driver/blink.log"), "") + "--- hardware log\n"
            + result.hwLog();
    }

    @Test
    void eachCaseEndsAsExpected() throws Exception {
        ExecutorService pool = Executors.newFixedThreadPool(4);
        List<Executable> checks = new ArrayList<>();
        for (String[] test : CASES) {
            Future<String> outcome = pool.submit(() -> outcome(test));
            checks.add(() -> AgentHarness.assertGolden(
                AgentHarness.data("machine/" + test[0] + ".txt"), outcome.get()));
        }
        pool.shutdown();
        assertAll(checks);
    }
}
