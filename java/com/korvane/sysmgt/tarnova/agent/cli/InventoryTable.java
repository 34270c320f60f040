package com.korvane.sysmgt.tarnova.agent.cli;

import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;

/**
 * One kind of object as the agent reports it: a numeric element per object (values in the
 * order of the field names) and, for some kinds, text columns whose element i belongs to
 * object i.
 */
public final class InventoryTable {
    /** The value of a 32-bit field that means none or unknown, as Java receives it. */
    public static final long NONE = 4294967295L;

    public static final List<String> SYSTEM_FIELDS = List.of(
        "SystemID", "StringID", "ChassisNum", "DrawerNum", "FirstSlotNum", "UnitSlotCount");
    public static final List<String> BUS_FIELDS = List.of("BusID", "BusNum", "ChassisNum",
        "DrawerNum", "LoadAt33", "LoadAt66", "LoadAtX66", "LoadAtX100", "LoadAtX133",
        "CurBusSpeed", "InPciXMode", "SupHotPlug");
    public static final List<String> SLOT_FIELDS = List.of("SlotID", "BusID", "ChassisNum",
        "DrawerNum", "DevNum", "FriendlyNum", "Width", "AttnReason", "Status", "Sup5V", "SupPME",
        "SupSMBUS", "SupHotPlug", "PciX", "SpeedBits", "AttnLedBlinking", "HalfLength",
        "LowProfile");
    public static final List<String> ADAPTER_FIELDS = List.of("AdapterID", "SlotID",
        "MaxSpeed", "PowerReq", "Width", "HasBridge", "IsBootDev", "SupPciX", "OnBoard", "BusID",
        "Device", "Function");

    private final String title;
    private final List<String> fields;
    private final long[][] rows;
    private final Map<String, String[]> texts = new LinkedHashMap<>();

    /**
     * @param rows a numeric inventory
     * @throws IllegalArgumentException if the library could not build it (null) or an element
     *     does not hold one value per field
     */
    public InventoryTable(String title, List<String> fields, long[][] rows) {
        this.title = title;
        this.fields = fields;
        this.rows = present(rows, title).clone();
        for (int i = 0; i < this.rows.length; i++) {
            if (this.rows[i] == null || this.rows[i].length != fields.size()) {
                throw new IllegalArgumentException(String.format(
                    "%s element %d has %s values, expected %d", title, i,
                    this.rows[i] == null ? "no" : String.valueOf(this.rows[i].length),
                    fields.size()));
            }
        }
    }

    /**
     * Adds a text column from a string inventory; returns this table.
     *
     * @throws IllegalArgumentException if the library could not build it (null)
     */
    public InventoryTable withText(String column, String[] values) {
        texts.put(column, present(values, title + " " + column).clone());
        return this;
    }

    private static <T> T present(T inventory, String what) {
        if (inventory == null) {
            throw new IllegalArgumentException("the library gave no inventory of " + what);
        }
        return inventory;
    }

    public String title() {
        return title;
    }

    public List<String> fields() {
        return fields;
    }

    public List<String> textColumns() {
        return List.copyOf(texts.keySet());
    }

    public int size() {
        return rows.length;
    }

    public long value(int row, int field) {
        return rows[row][field];
    }

    /** The value of the named field for one object. */
    public long value(int row, String field) {
        int index = fields.indexOf(field);
        if (index < 0) {
            throw new IllegalArgumentException(title + " have no field " + field);
        }
        return rows[row][index];
    }

    /** The text of a column for one object; null when the string inventory has no element. */
    public String text(int row, String column) {
        String[] values = texts.get(column);
        return values != null && row < values.length ? values[row] : null;
    }
}
