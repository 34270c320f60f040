package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.*;

import java.nio.file.*;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/** The 32-bit agent in the 32-bit JVM against the 64-bit one, on the sample machine. */
class I386Test {
    @TempDir
    Path temp;

    private AgentHarness harness() {
        return new AgentHarness(temp).onMachine(AgentHarness.sample("chassis-drawer"));
    }

    @Test
    void the32BitAgentPrintsThe64BitDocumentThroughThe32BitDriverProtocol() throws Exception {
        AgentHarness.Result i386 = harness().agent("--json");
        AgentHarness.Result x64 = harness().on64Bit().agent("--json");
        assertEquals(0, i386.exitCode(), i386::toString);
        assertEquals(0L, i386.document().get("status").getAsLong(), i386::toString);
        assertEquals(x64.stdout(), i386.stdout());
        // The emulated driver of a 32-bit run knows only the 32-bit request codes; any other
        // would be logged as "ioctl 0xCODE".
        assertTrue(i386.driverRequests().contains("table"), i386.driverRequests()::toString);
        assertEquals(x64.driverRequests(), i386.driverRequests());

        AgentHarness.Result blink = harness().agent("--blink", "5", "1");
        assertEquals(0, blink.exitCode(), blink::toString);
        assertEquals("5 1\n", Files.readString(blink.runDir().resolve("driver/blink.log")));
        assertTrue(blink.driverRequests().stream().noneMatch(line -> line.startsWith("ioctl")),
            blink.driverRequests()::toString);
    }
}
