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
        // The readable report of each sample; no topology without a driver and a file.
        {"report-chassis-drawer", "chassis-drawer", "", ""},
        {"report-file-table", "file-table", "", ""},
        {"report-current-kernel", "current-kernel", "", ""},
        {"report-cardfile-mistakes", "cardfile-mistakes", "", ""},
        {"no-topology", "chassis-drawer", "rm -r driver modules/velhpdrv", "--tables"},
        // A vendor name in UTF-8 reaches Java decoded: "f\u00fcr", not "f\u00c3\u00bcr".
        {"utf8-name", "chassis-drawer",
            "sed -i 's/^10df  Emulex Corporation/10df  Emulex f\\xc3\\xbcr Fasern/' usr/share/pci.ids",
            "--json"},
        // A blink the driver takes, refuses, and one of a slot ID that no slot has.
        {"blink", "chassis-drawer", "", "--blink 4 4294967295"},
        {"blink-refused", "chassis-drawer", "echo blink >driver/fail", "--blink 3 1"},
        {"blink-no-slot", "chassis-drawer", "", "--blink 14 1"},
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
        // Each JVM is process 2 of its namespace: its perf data file goes to the run's own /tmp.
        String perfData = "tmp/hsperfdata_" + System.getProperty("user.name");
        assertTrue(Files.isDirectory(result.runDir().resolve(perfData)), result::toString);
        return result.stdout() + "--- exit " + result.exitCode() + "\n"
            + result.stderr().replace(result.runDir().toString(), "RUN")
            + "--- driver requests\n"
            + Objects.toString(result.file("driver/requests.log"), "") + "--- driver blink\n"
            + Objects.toString(result.file("driver/blink.log"), "") + "--- hardware log\n"
            + result.hwLog();
    }

    /**
     * Each adapter of the inventory table in the sample's EXPECTED.md has a line in the report
     * with its address, driver file and boot flag, under its card's name (or with its own) and
     * in the section of its slot: its label and ID, on-board, or no slot the table lists.
     */
    static void assertReportAgrees(String sample, List<String> report) throws Exception {
        String expected = Files.readString(AgentHarness.sample(sample).resolve("EXPECTED.md"));
        String table = expected.substring(expected.indexOf("## Inventory"));
        for (String row : table.substring(0, table.indexOf("\n## ")).split("\n")) {
            String[] cell = row.split(" \\| ");
            if (!row.matches("\\| \\d+ \\|.*")) {
                continue;
            }
            String line = cell[2].replace("-1", "-") + "  driver "
                + cell[15].replace("(empty)", "-") + (cell[11].equals("yes") ? "  boot device" : "");
            int at = report.indexOf(report.stream().filter(l -> (l.trim() + "  ").startsWith(
                line + "  ")).findFirst().orElseThrow(() -> new AssertionError(sample + row)));
            String card = "";
            String section = "";
            for (int i = at; i >= 0 && section.isEmpty(); i--) {
                String above = report.get(i);
                card = card.isEmpty() && above.matches(".*  \\[[-0-9a-f:]+\\]") ? above : card;
                section = above.matches("(  Slot \\d|  Unnumbered|On-board|Cards in).*") ? above : "";
            }
            assertTrue(card.trim().startsWith(cell[14] + "  [")
                || report.get(at).endsWith("  " + cell[14]), sample + row);
            assertTrue(section.startsWith(cell[12].equals("yes") ? "On-board devices"
                : cell[4].equals("-1") ? "Cards in slots"
                : (cell[4].equals("255") ? "  Unnumbered slot" : "  Slot " + cell[4])
                    + " (ID " + cell[3] + ")"), sample + row + section);
        }
    }

    @Test
    void eachCaseEndsAsExpected() throws Exception {
        ExecutorService pool = Executors.newFixedThreadPool(4);
        List<Executable> checks = new ArrayList<>();
        for (String[] test : CASES) {
            Future<String> outcome = pool.submit(() -> outcome(test));
            checks.add(() -> {
                AgentHarness.assertGolden(
                    AgentHarness.data("machine/" + test[0] + ".txt"), outcome.get());
                if (test[0].startsWith("report-")) {
                    assertReportAgrees(test[1], outcome.get().lines().toList());
                }
            });
        }
        pool.shutdown();
        assertAll(checks);
    }
}
