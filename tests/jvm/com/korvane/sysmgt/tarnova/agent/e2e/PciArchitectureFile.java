package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;

import java.io.IOException;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.Arrays;
import java.util.Collections;
import java.util.HashMap;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Locale;
import java.util.Map;

/**
 * The tests' own reading of a PCI architecture file: what the agent has to report for the
 * topology that a machine's readable description states, worked out here from the text and not
 * copied from an earlier run. It is strict: a line it does not understand, a missing value, a
 * repeated bus or a system without its name is an error, so that a sample file the tests cannot
 * read fails loudly instead of weakening the comparison.
 *
 * <p>The expectations follow the agent's rules: the lists hand out their objects in the reverse
 * of the table's order; a slot takes chassis and drawer from its bus; a bus supports hot plug
 * when one of its slots does; a system counts the slots of its busses (a drawer's busses by
 * drawer number, a chassis's those in no drawer) and starts at the lowest slot ID; a name
 * reaches Java with at most 100 characters; 4294967295 stands for none; on a machine that runs
 * SuSE SLES-8 no slot supports hot plug, while its busses keep what their slots stated.
 */
final class PciArchitectureFile {
    static final long NONE = 4294967295L;
    static final int NO_DRAWER = 255;
    /** What a Java string of the inventories holds at most. */
    static final int NAME_LENGTH = 100;
    private static final int HEADER_SIZE = 16;
    private static final int DESCRIPTOR_SIZE = 16;
    private static final int STRING_OVERHEAD = 3;
    private static final int END_MARKER_SIZE = 1;

    private static final class Bus {
        int id;
        int chassis;
        int drawer;
        int number;
        int speedCode;
        int[] loads;
    }

    private static final class Slot {
        int id;
        int bus;
        int device;
        int sun;
        int attrib1;
        int attrib2;
        int attention;
        int status;
        int led;
    }

    private static final class Unit {
        boolean drawer;
        int number;
        int stringId;
    }

    private enum Section { NONE, HEADER, BUS, SLOT, CHASSIS, DRAWER, STRING }

    private static final Map<String, Section> SECTIONS = Map.of(
        "[table header]", Section.HEADER, "[bus]", Section.BUS, "[slot]", Section.SLOT,
        "[chassis]", Section.CHASSIS, "[drawer]", Section.DRAWER, "[string]", Section.STRING);

    private final List<Bus> busses = new ArrayList<>();
    private final List<Slot> slots = new ArrayList<>();
    private final List<Unit> units = new ArrayList<>();
    private final Map<Integer, String> strings = new HashMap<>();
    private long packetSize = END_MARKER_SIZE;
    private boolean slotsWithoutHotPlug;

    private PciArchitectureFile() {
    }

    /** Reads a file of a machine folder (its driver/ or install/), noting the distribution. */
    static PciArchitectureFile read(Path file) throws IOException {
        PciArchitectureFile table = parse(Files.readString(file, StandardCharsets.ISO_8859_1));
        Path release = file.toAbsolutePath().getParent().resolveSibling("etc/SuSE-release");
        table.slotsWithoutHotPlug =
            Files.exists(release) && Files.readString(release).startsWith("SuSE SLES-8 ");
        return table;
    }

    static PciArchitectureFile parse(String text) {
        PciArchitectureFile table = new PciArchitectureFile();
        Section section = Section.NONE;
        String[] lines = text.split("\n", -1);
        // The piece after the last line end is no line: the agent's reader leaves it out too.
        for (int number = 1; number < lines.length; number++) {
            String line = prepare(lines[number - 1]);
            if (line.isEmpty()) {
                continue;
            }
            if (line.startsWith("[") && line.endsWith("]")) {
                section = SECTIONS.getOrDefault(line.toLowerCase(Locale.ROOT), Section.NONE);
                continue;
            }
            try {
                table.add(section, new Tokens(line));
            } catch (IllegalArgumentException e) {
                throw new IllegalArgumentException("line " + number + ": " + e.getMessage(), e);
            }
        }
        return table;
    }

    /** The size of the table that the file compiles to, in bytes. */
    long packetSize() {
        return packetSize;
    }

    /** The system names as the file states them, in the table's order, uncut. */
    List<String> systemNames() {
        List<String> names = new ArrayList<>();
        for (Unit unit : units) {
            names.add(name(unit));
        }
        return names;
    }

    /** The systems that getSystemNumInv and getSystemNameInv report, as the JSON gives them. */
    List<Map<String, Object>> systems() {
        List<Map<String, Object>> expected = new ArrayList<>();
        for (int i = 0; i < units.size(); i++) {
            Unit unit = units.get(i);
            long firstSlot = NONE;
            long slotCount = 0;
            for (Bus bus : busses) {
                boolean onUnit = unit.drawer
                    ? bus.drawer == unit.number
                    : bus.drawer == NO_DRAWER && bus.chassis == unit.number;
                if (onUnit) {
                    firstSlot = Math.min(firstSlot, firstSlot(bus));
                    slotCount += slotsOn(bus).size();
                }
            }
            String name = name(unit);
            expected.add(element(
                "SystemID", i, "StringID", unit.stringId,
                "ChassisNum", unit.drawer ? NO_DRAWER : unit.number,
                "DrawerNum", unit.drawer ? unit.number : NO_DRAWER,
                "FirstSlotNum", firstSlot, "UnitSlotCount", slotCount,
                "Name", name.substring(0, Math.min(name.length(), NAME_LENGTH))));
        }
        return reversed(expected);
    }

    /** The busses that getBusNumInv reports, with the speeds that the table states. */
    List<Map<String, Object>> busses() {
        List<Map<String, Object>> expected = new ArrayList<>();
        for (Bus bus : busses) {
            boolean hotPlug = slotsOn(bus).stream().anyMatch(slot -> (slot.attrib1 & 0x01) != 0);
            expected.add(element(
                "BusID", bus.id, "BusNum", bus.number, "ChassisNum", bus.chassis,
                "DrawerNum", bus.drawer, "LoadAt33", bus.loads[0], "LoadAt66", bus.loads[1],
                "LoadAtX66", bus.loads[2], "LoadAtX100", bus.loads[3],
                "LoadAtX133", bus.loads[4], "CurBusSpeed", megahertz(bus.speedCode),
                "InPciXMode", flag(bus.speedCode > 1), "SupHotPlug", flag(hotPlug)));
        }
        return reversed(expected);
    }

    /** The slots that getSlotNumInv reports. */
    List<Map<String, Object>> slots() {
        List<Map<String, Object>> expected = new ArrayList<>();
        for (Slot slot : slots) {
            Bus bus = bus(slot.bus);
            int a = slot.attrib1;
            expected.add(element(
                "SlotID", slot.id, "BusID", slot.bus,
                // A slot whose bus the table lacks keeps chassis and drawer 0.
                "ChassisNum", bus == null ? 0 : bus.chassis,
                "DrawerNum", bus == null ? 0 : bus.drawer,
                "DevNum", slot.device, "FriendlyNum", slot.sun,
                "Width", (a & 0x04) != 0 ? 64 : 32, "AttnReason", slot.attention,
                "Status", slot.status, "Sup5V", bit(a, 1), "SupPME", bit(a, 4),
                "SupSMBUS", bit(a, 5), "SupHotPlug", slotsWithoutHotPlug ? 0L : bit(a, 0),
                "PciX", flag((slot.attrib2 & 0x7C) != 0), "SpeedBits", slot.attrib2 & 0x7F,
                "AttnLedBlinking", bit(slot.led, 3), "HalfLength", bit(a, 6),
                "LowProfile", bit(a, 7)));
        }
        return reversed(expected);
    }

    /**
     * Checks the systems, busses and slots of the agent's JSON document against this table,
     * element by element, leaving out the named fields (those a later step of the agent works
     * out, such as the speeds of a table from a file).
     */
    void assertReported(Map<String, Object> document, String... ignoredFields) {
        assertKind("systems", systems(), document, ignoredFields);
        assertKind("busses", busses(), document, ignoredFields);
        assertKind("slots", slots(), document, ignoredFields);
    }

    private static void assertKind(String kind, List<Map<String, Object>> expected,
                                   Map<String, Object> document, String[] ignoredFields) {
        List<?> reported = (List<?>) document.get(kind);
        assertEquals(expected.size(), reported.size(), () -> kind + ": " + reported);
        for (int i = 0; i < expected.size(); i++) {
            Map<Object, Object> want = new LinkedHashMap<>(expected.get(i));
            Map<Object, Object> got = new LinkedHashMap<>((Map<?, ?>) reported.get(i));
            for (String field : ignoredFields) {
                want.remove(field);
                got.remove(field);
            }
            assertEquals(want, got, kind + " element " + i);
        }
    }

    private void add(Section section, Tokens tokens) {
        switch (section) {
            case HEADER:
                tokens.text();
                tokens.numbers(2);
                tokens.text();
                packetSize += HEADER_SIZE;
                return;
            case BUS:
                addBus(tokens.numbers(12));
                break;
            case SLOT:
                addSlot(tokens.numbers(10));
                break;
            case CHASSIS:
            case DRAWER:
                Unit unit = new Unit();
                unit.drawer = section == Section.DRAWER;
                int[] values = tokens.numbers(2);
                unit.number = values[0] & 0xFF;
                unit.stringId = values[1] & 0xFF;
                units.add(unit);
                break;
            case STRING:
                int number = tokens.numbers(1)[0] & 0xFF;
                String text = tokens.text();
                // A later string of the same number replaces the earlier one.
                strings.put(number, text);
                packetSize += STRING_OVERHEAD + text.length();
                return;
            default:
                throw new IllegalArgumentException("data line outside a known section");
        }
        packetSize += DESCRIPTOR_SIZE;
    }

    private void addBus(int[] values) {
        Bus bus = new Bus();
        bus.id = values[0] & 0xFF;
        bus.chassis = values[1] & 0xFF;
        bus.drawer = values[2] & 0xFF;
        bus.number = values[3] & 0xFF;
        bus.speedCode = values[6] & 0xFF;
        bus.loads = Arrays.stream(values, 7, 12).map(value -> value & 0xFF).toArray();
        if (bus(bus.id) != null) {
            throw new IllegalArgumentException("bus " + bus.id + " is listed twice");
        }
        busses.add(bus);
    }

    private void addSlot(int[] values) {
        Slot slot = new Slot();
        slot.id = values[0] & 0xFFFF;
        slot.bus = values[1] & 0xFF;
        slot.device = values[2] & 0xFF;
        slot.sun = values[3] & 0xFF;
        slot.attrib1 = values[4] & 0xFF;
        slot.attrib2 = values[5] & 0xFF;
        slot.attention = values[6] & 0xFF;
        slot.status = values[7] & 0xFF;
        slot.led = values[8] & 0xFF;
        slots.add(slot);
    }

    private Bus bus(int id) {
        return busses.stream().filter(bus -> bus.id == id).findFirst().orElse(null);
    }

    private List<Slot> slotsOn(Bus bus) {
        List<Slot> on = new ArrayList<>();
        for (Slot slot : slots) {
            if (slot.bus == bus.id) {
                on.add(slot);
            }
        }
        return on;
    }

    private long firstSlot(Bus bus) {
        return slotsOn(bus).stream().mapToLong(slot -> slot.id).min().orElse(NONE);
    }

    private String name(Unit unit) {
        String name = strings.get(unit.stringId);
        if (name == null) {
            throw new IllegalArgumentException("no string " + unit.stringId + " for a system");
        }
        return name;
    }

    private static long megahertz(int speedCode) {
        switch (speedCode) {
            case 0:
                return 33;
            case 1:
            case 5:
                return 66;
            case 6:
                return 100;
            case 7:
                return 133;
            default:
                return 0;
        }
    }

    private static long flag(boolean value) {
        return value ? 1 : 0;
    }

    private static long bit(int value, int bit) {
        return (value >> bit) & 1;
    }

    /** A JSON element: keys and values alternate; numbers become Longs as MiniJson reads them. */
    private static Map<String, Object> element(Object... keysAndValues) {
        Map<String, Object> element = new LinkedHashMap<>();
        for (int i = 0; i < keysAndValues.length; i += 2) {
            Object value = keysAndValues[i + 1];
            element.put((String) keysAndValues[i],
                value instanceof Number ? (Object) ((Number) value).longValue() : value);
        }
        return element;
    }

    private static <T> List<T> reversed(List<T> list) {
        Collections.reverse(list);
        return list;
    }

    /** The line without its "//" comment and without leading and trailing blanks. */
    private static String prepare(String line) {
        int comment = line.indexOf("//");
        String text = comment >= 0 ? line.substring(0, comment) : line;
        int start = 0;
        int end = text.length();
        while (start < end && isBlank(text.charAt(start))) {
            start++;
        }
        while (end > start && isBlank(text.charAt(end - 1))) {
            end--;
        }
        return text.substring(start, end);
    }

    /** Blanks as the agent's reader counts them: spaces, control characters, bytes from 0x80. */
    private static boolean isBlank(char c) {
        return c <= ' ' || c >= 0x7F;
    }

    /** The tokens of a data line: blank-separated, a quoted token may hold blanks. */
    private static final class Tokens {
        private final String line;
        private int at;

        Tokens(String line) {
            this.line = line;
        }

        String text() {
            while (at < line.length() && isBlank(line.charAt(at))) {
                at++;
            }
            if (at >= line.length()) {
                throw new IllegalArgumentException("too few values: " + line);
            }
            int start = at;
            if (line.charAt(at) == '"') {
                int close = line.indexOf('"', at + 1);
                if (close < 0) {
                    throw new IllegalArgumentException("unbalanced quote: " + line);
                }
                at = close + 1;
                return line.substring(start + 1, close);
            }
            while (at < line.length() && !isBlank(line.charAt(at))) {
                at++;
            }
            return line.substring(start, at);
        }

        int[] numbers(int count) {
            int[] values = new int[count];
            for (int i = 0; i < count; i++) {
                String token = text();
                boolean hex = token.startsWith("0x") || token.startsWith("0X");
                try {
                    values[i] =
                        (int) Long.parseLong(hex ? token.substring(2) : token, hex ? 16 : 10);
                } catch (NumberFormatException e) {
                    throw new IllegalArgumentException("not a number: " + token, e);
                }
            }
            return values;
        }
    }
}
