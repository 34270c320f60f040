package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.*;
import static org.junit.jupiter.api.Assertions.*;

import com.google.gson.JsonParser;
import com.korvane.sysmgt.tarnova.agent.cli.*;
import java.io.IOException;
import java.nio.file.*;
import org.junit.jupiter.api.Test;

/**
 * The JSON document and the report of inventories with content, against data/formatting.*
 * (no library needed).
 */
class FormattingTest {
    private static final long NONE = 4294967295L;
    private static final String AWKWARD_NAME = "Drawer \"A\"\\1\n\t\u00e9\u20ac\ud83d";

    private static long[] sequence(int length, long first) {
        return java.util.stream.LongStream.range(first, first + length).toArray();
    }

    private static Inventory sample() {
        long[] system = {0, 1, 0, 255, 1, 4};
        long[] drawer = {1, 2, 255, 0, NONE, 0};
        long[] bus = sequence(12, 100);
        bus[9] = NONE;
        long[] adapter = sequence(12, 300);
        adapter[1] = NONE;
        return new Inventory("4.20", 7,
            new InventoryTable("systems", InventoryTable.SYSTEM_FIELDS,
                new long[][] {system, drawer}).withText("Name",
                new String[] {"Chassis", AWKWARD_NAME}),
            new InventoryTable("busses", InventoryTable.BUS_FIELDS, new long[][] {bus}),
            new InventoryTable("slots", InventoryTable.SLOT_FIELDS, new long[0][]),
            new InventoryTable("adapters", InventoryTable.ADAPTER_FIELDS,
                new long[][] {adapter}).withText("Name", new String[] {""})
                .withText("PciId", new String[] {"8086:1229"})
                .withText("Driver", new String[] {"<Unavailable>"}));
    }

    @Test
    void theDocumentAndTheReportAreAsExpected() throws IOException {
        String json = JsonWriter.write(sample());
        assertGolden(data("formatting.json"), json);
        assertEquals(AWKWARD_NAME, JsonParser.parseString(json).getAsJsonObject().getAsJsonArray("systems").get(1)
            .getAsJsonObject().get("Name").getAsString());
        assertEquals("\"\\u0001\\u007f\"", JsonWriter.quote("\u0001\u007f"));
        // The name's lone surrogate has no UTF-8 form; its length still sets the column's width.
        assertGolden(data("formatting.report"),
            ReportFormatter.format(sample()).replace(AWKWARD_NAME, "Drawer (awkward)"));
    }

    @Test
    void anElementOfTheWrongLengthIsRejected() {
        assertThrows(IllegalArgumentException.class, () -> new InventoryTable("busses",
            InventoryTable.BUS_FIELDS, new long[][] {new long[11]}));
        assertThrows(IllegalArgumentException.class, () -> new InventoryTable("busses",
            InventoryTable.BUS_FIELDS, new long[][] {null}));
        assertEquals(0, new InventoryTable("busses", InventoryTable.BUS_FIELDS, null).size());
    }
}
