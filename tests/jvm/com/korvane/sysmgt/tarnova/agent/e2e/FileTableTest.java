package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.assertTopology;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertFalse;
import static org.junit.jupiter.api.Assertions.assertTrue;

import com.google.gson.JsonArray;
import com.google.gson.JsonObject;
import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.List;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/**
 * The slot topology from a PCI architecture file in the install folder, chosen by the machine
 * type and model of the firmware record: on the sample machine without a slot driver, and on
 * the one with a driver, which the file then replaces.
 */
class FileTableTest {
    private static final Path FILE_MACHINE = AgentHarness.sampleMachine("file-table");
    private static final Path DRIVER_MACHINE = AgentHarness.sampleMachine("chassis-drawer");
    /** The file machine's firmware record says type K320, model F1T. */
    private static final String TYPE_MODEL_FILE = "install/K320F1T.pci";
    private static final String TYPE_FILE = "install/K320.pci";

    @TempDir
    Path temp;

    /** Copies a file into the run's machine copy (relative to the copy). */
    private static AgentHarness.MachineEdit copy(Path from, String to) {
        return machine -> Files.copy(from, machine.resolve(to));
    }

    @Test
    void theFileMachinesTopologyArrivesFromItsFileAndMeetsThePrerequisites() throws IOException {
        AgentHarness.Result result = new AgentHarness(temp).onMachine(FILE_MACHINE)
            .agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        // A PCI architecture file stands in for the slot driver among the prerequisites.
        assertEquals(0, result.document().get("status").getAsLong());
        assertTopology("file-table.json", result.document());
        String log = result.hwLog();
        assertTrue(log.contains("GetHwInfo():  getting table from file\n"
            + "GetHwInfo():  using PCI architecture file\n"
            + "GetHwInfo():  storing PCI architecture table\n"), log);
        // Neither the prerequisite check nor the acquisition looked for a driver.
        assertFalse(log.contains("velhpdrv"), log);
        assertFalse(log.contains("getting ASL table"), log);
    }

    @Test
    void aFileBeatsTheDriverWhichIsNotAskedForItsTable() throws IOException {
        AgentHarness.Result result = new AgentHarness(temp).onMachine(DRIVER_MACHINE)
            .editMachine(copy(FILE_MACHINE.resolve(TYPE_MODEL_FILE), "install/K740C4D.pci"))
            .scenario("json", "blink:3:1");
        assertEquals(0, result.exitCode, result::toString);
        JsonObject document = AgentHarness.json(result.values("json").get(0));
        assertEquals(0, document.get("status").getAsLong());
        // The speeds are worked out from this machine's adapters, not the file machine's.
        assertTopology("file-table.json", document, "CurBusSpeed", "InPciXMode");
        // The driver got the blink and nothing else: no version, no size, no table.
        assertEquals(List.of("open", "blink 3 1"), result.driverRequests());
    }

    @Test
    void aFileNamedAfterTypeAndModelBeatsOneNamedAfterTheType() throws IOException {
        Path otherTopology = DRIVER_MACHINE.resolve("driver/asl.pci");
        AgentHarness.Result both = new AgentHarness(temp).onMachine(FILE_MACHINE)
            .editMachine(copy(otherTopology, TYPE_FILE)).agent("--json");
        assertEquals(0, both.exitCode, both::toString);
        assertTopology("file-table.json", both.document());

        AgentHarness.Result typeOnly = new AgentHarness(temp).onMachine(FILE_MACHINE)
            .editMachine(machine -> Files.delete(machine.resolve(TYPE_MODEL_FILE)))
            .editMachine(copy(otherTopology, TYPE_FILE)).agent("--json");
        assertEquals(0, typeOnly.exitCode, typeOnly::toString);
        // The driver machine's topology, with the speeds worked out from the adapters.
        assertTopology("chassis-drawer.json", typeOnly.document(), "CurBusSpeed", "InPciXMode");

        // A file for another model of the type is not this machine's: without a driver there
        // is then no table at all.
        AgentHarness.Result otherModel = new AgentHarness(temp).onMachine(FILE_MACHINE)
            .editMachine(machine -> Files.move(machine.resolve(TYPE_MODEL_FILE),
                machine.resolve("install/K320C4D.pci")))
            .agent("--json");
        assertEquals(0, otherModel.exitCode, otherModel::toString);
        JsonObject none = otherModel.document();
        assertEquals(4, none.get("status").getAsLong(), "no architecture file and no driver");
        for (String kind : List.of("systems", "busses", "slots", "adapters")) {
            assertEquals(new JsonArray(), none.get(kind), kind);
        }
        assertTrue(otherModel.hwLog().contains(
            "velhlib, GetHwInfo():  PCI architecture information is unavailable\n"),
            otherModel::hwLog);
    }
}
