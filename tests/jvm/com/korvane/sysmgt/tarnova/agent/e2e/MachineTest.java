package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** The agent under the simulator, on the sample machine with a slot driver and a table. */
class MachineTest {
    @TempDir
    Path temp;

    private AgentHarness harness() {
        return new AgentHarness(temp).onMachine(AgentHarness.sampleMachine("x440-chassis-drawer"));
    }

    @Test
    void blinkReachesTheDriverWithTheLow32BitsOfTheSlot() throws IOException {
        AgentHarness.Result result = harness().agent("--blink", "4294967301", "-1");
        assertEquals(0, result.exitCode, result::toString);
        assertEquals("5 4294967295\n",
            Files.readString(result.runDir.resolve("driver/blink.log")));
    }
}
