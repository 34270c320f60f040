package com.korvane.sysmgt.tarnova.agent.e2e;

import static com.korvane.sysmgt.tarnova.agent.e2e.AgentHarness.occurrences;
import static org.junit.jupiter.api.Assertions.assertEquals;
import static org.junit.jupiter.api.Assertions.assertThrows;
import static org.junit.jupiter.api.Assertions.assertTrue;

import com.google.gson.JsonArray;
import com.google.gson.JsonElement;
import com.google.gson.JsonObject;
import com.korvane.sysmgt.tarnova.agent.cli.Inventory;
import com.korvane.sysmgt.tarnova.agent.cli.InventoryTable;
import com.korvane.sysmgt.tarnova.agent.cli.JsonWriter;
import com.korvane.sysmgt.tarnova.agent.cli.ReportFormatter;
import java.util.List;
import org.junit.jupiter.api.Test;

/** The report and the JSON document for inventories with content (no library needed). */
class FormattingTest {
    private static final long NONE = 4294967295L;
    private static final String AWKWARD_NAME = "Drawer \"A\"\\1\n\t\u00e9\u20ac\ud83d";

    private static long[] sequence(int length, long first) {
        long[] values = new long[length];
        for (int i = 0; i < length; i++) {
            values[i] = first + i;
        }
        return values;
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

    private static List<String> keys(JsonElement element) {
        return List.copyOf(element.getAsJsonObject().keySet());
    }

    @Test
    void jsonElementsHaveExactlyTheFieldNamesAndTheArrayValues() {
        JsonObject document = AgentHarness.json(JsonWriter.write(sample()));
        assertEquals("4.20", document.get("version").getAsString());
        assertEquals(7, document.get("status").getAsLong());

        JsonArray systems = document.getAsJsonArray("systems");
        assertEquals(List.of("SystemID", "StringID", "ChassisNum", "DrawerNum", "FirstSlotNum",
            "UnitSlotCount", "Name"), keys(systems.get(0)));
        assertEquals(AgentHarness.json("{\"SystemID\": 1, \"StringID\": 2, \"ChassisNum\": 255, "
            + "\"DrawerNum\": 0, \"FirstSlotNum\": 4294967295, \"UnitSlotCount\": 0, \"Name\": "
            + JsonWriter.quote(AWKWARD_NAME) + "}"), systems.get(1));
        assertEquals(AWKWARD_NAME, systems.get(1).getAsJsonObject().get("Name").getAsString());

        JsonObject bus = document.getAsJsonArray("busses").get(0).getAsJsonObject();
        assertEquals(List.of("BusID", "BusNum", "ChassisNum", "DrawerNum", "LoadAt33",
            "LoadAt66", "LoadAtX66", "LoadAtX100", "LoadAtX133", "CurBusSpeed", "InPciXMode",
            "SupHotPlug"), keys(bus));
        assertEquals(NONE, bus.get("CurBusSpeed").getAsLong());
        assertEquals(111, bus.get("SupHotPlug").getAsLong());
        assertEquals(new JsonArray(), document.get("slots"));
        assertEquals(18, InventoryTable.SLOT_FIELDS.size());

        JsonObject adapter = document.getAsJsonArray("adapters").get(0).getAsJsonObject();
        assertEquals(List.of("AdapterID", "SlotID", "MaxSpeed", "PowerReq", "Width", "HasBridge",
            "IsBootDev", "SupPciX", "OnBoard", "BusID", "Device", "Function", "Name", "PciId",
            "Driver"), keys(adapter));
        assertEquals(NONE, adapter.get("SlotID").getAsLong());
        assertEquals("", adapter.get("Name").getAsString());
        assertEquals("8086:1229", adapter.get("PciId").getAsString());
    }

    @Test
    void jsonStringsAreEscapedToPlainAscii() {
        String quoted = JsonWriter.quote(AWKWARD_NAME);
        assertEquals("\"Drawer \\\"A\\\"\\\\1\\n\\t\\u00e9\\u20ac\\ud83d\"", quoted);
        assertTrue(quoted.chars().allMatch(c -> c >= 0x20 && c < 0x7f), quoted);
        assertEquals("\"\\u0001\\u007f\"", JsonWriter.quote("\u0001\u007f"));
    }

    @Test
    void theReportAlignsItsColumnsAndShowsNoneAsADash() {
        String report = ReportFormatter.format(sample());
        assertTrue(report.startsWith("Agent version: 4.20\n"
            + "Status: 7 (the slot driver gave no ASL table)\n"), report);

        List<String> lines = List.of(report.split("\n"));
        int header = lines.indexOf("Systems: 2") + 1;
        String columns = lines.get(header);
        String chassis = lines.get(header + 1);
        String drawer = lines.get(header + 2);
        assertTrue(columns.startsWith("SystemID  StringID  ChassisNum"), columns);
        // Numbers end under the end of their column name; the none value is a dash.
        int firstSlotEnd = columns.indexOf("FirstSlotNum") + "FirstSlotNum".length();
        assertEquals("-", drawer.substring(firstSlotEnd - 1, firstSlotEnd));
        assertEquals("1", chassis.substring(firstSlotEnd - 1, firstSlotEnd));
        assertEquals(columns.indexOf("Name"), chassis.indexOf("Chassis"));
        assertEquals(columns.indexOf("Name"), drawer.indexOf("Drawer"));

        int busHeader = lines.indexOf("Busses: 1") + 1;
        String busRow = lines.get(busHeader + 1);
        int speedEnd = lines.get(busHeader).indexOf("CurBusSpeed") + "CurBusSpeed".length();
        assertEquals("  -", busRow.substring(speedEnd - 3, speedEnd));
        assertTrue(!report.contains(Long.toString(NONE)), report);
        assertTrue(report.contains("Slots: 0\nSlotID  BusID"), report);
        assertEquals(1, occurrences(report, "(none)"), report);
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
