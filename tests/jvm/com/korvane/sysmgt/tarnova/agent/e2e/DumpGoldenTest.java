package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.*;

import java.nio.file.*;
import java.util.*;
import org.junit.jupiter.api.io.TempDir;
import org.junit.jupiter.params.ParameterizedTest;
import org.junit.jupiter.params.provider.CsvSource;

/**
 * The hardware-information log of one acquisition on the sample machine, at each debug level,
 * equals tests/golden/NAME.log (object addresses masked); VELH_GOLDEN_UPDATE=1 writes it instead.
 */
class DumpGoldenTest {
    @TempDir
    Path temp;

    @ParameterizedTest
    @CsvSource({"raw-asl, 0x00000001", "cooked-asl, 0x00000002", "get-adapter, 0x00000004",
        "prereq-check, 0x00001000", "systems, 0x00020000", "busses, 0x00040000",
        "slots, 0x00080000", "slot-adapters, 0x00100000", "onboard-adapters, 0x00200000",
        "deleted-adapters, 0x00400000", "adapter-cfg-space, 0x00b00000",
        "agent-stats, 0x01000000", "object-address, 0x003f0000"})
    void eachDumpLogsAsExpected(String name, String level) throws Exception {
        AgentHarness.Result result = new AgentHarness(temp)
            .onMachine(AgentHarness.sample("chassis-drawer"))
            .edit("echo 'hwdbgprint " + level + "' >install/dbgprint").run("hwinfo exit");
        assertEquals(0, result.exitCode(), result::toString);
        // A level under which nothing is written leaves no log at all.
        AgentHarness.assertGolden(Path.of(AgentHarness.property("velh.golden.dir"), name + ".log"),
            Objects.toString(result.hwLog(), "")
                .replaceAll(" at 0x[0-9a-f]{8}:", " at 0xADDRESS:"));
    }
}
