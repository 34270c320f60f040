package com.korvane.sysmgt.tarnova.agent.cli;

import java.util.ArrayList;
import java.util.Collections;
import java.util.Comparator;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;
import java.util.function.Predicate;

/**
 * The machine as an operator sees it, joined from the eight inventories: each chassis and
 * drawer with its slots in label order, each slot with its bus and the card in it (a
 * multi-function card once, its functions in order), then the on-board devices and any card
 * whose slot the slot inventory does not list. Values keep their units (MHz, watts, bits) and
 * {@link #NONE} where the agent knows nothing.
 */
public final class Machine {
    /** A field that holds nothing: the agent's none value, also for an unnumbered slot. */
    public static final long NONE = InventoryTable.NONE;
    /** The chassis, drawer and slot-label numbers that stand for none. */
    static final long NO_NUMBER = 255;

    private final String version;
    private final long status;
    private final List<Enclosure> enclosures;
    private final List<Card> onBoard;
    private final List<Card> unplaced;
    private final boolean topology;

    private Machine(Inventory inventory) {
        version = inventory.version();
        status = inventory.status();
        List<InventoryTable> tables = inventory.tables();
        Map<Long, Bus> busses = new LinkedHashMap<>();
        InventoryTable busTable = tables.get(1);
        for (int row = 0; row < busTable.size(); row++) {
            Bus bus = new Bus(busTable, row);
            busses.putIfAbsent(bus.busId, bus);
        }
        List<Slot> slots = new ArrayList<>();
        InventoryTable slotTable = tables.get(2);
        for (int row = 0; row < slotTable.size(); row++) {
            Slot slot = new Slot(slotTable, row);
            slot.bus = busses.get(slot.busId);
            slots.add(slot);
        }
        onBoard = new ArrayList<>();
        unplaced = new ArrayList<>();
        placeCards(tables.get(3), busses, slots);
        enclosures = new ArrayList<>();
        InventoryTable systemTable = tables.get(0);
        List<Slot> left = new ArrayList<>(slots);
        for (int row = 0; row < systemTable.size(); row++) {
            Enclosure enclosure = new Enclosure(systemTable, row);
            enclosure.slots = take(left, enclosure::holds);
            enclosures.add(enclosure);
        }
        enclosures.sort(Comparator.comparing(Enclosure::isDrawer)
            .thenComparing(e -> e.isDrawer() ? e.drawer : e.chassis)
            .thenComparing(e -> e.systemId));
        if (!left.isEmpty()) {
            Enclosure unlisted = new Enclosure(null, -1);
            unlisted.slots = take(left, slot -> true);
            enclosures.add(unlisted);
        }
        topology = systemTable.size() + busTable.size() + slotTable.size() > 0;
    }

    /** Whether a text of the library says something: it is not absent, empty or unavailable. */
    public static boolean known(String text) {
        return text != null && !text.isEmpty() && !text.equals("<Unavailable>");
    }

    /** A bus or device number as lspci prints it; none for the agent's none value. */
    public static String hex(long value, String none) {
        return value == NONE ? none : String.format("%02x", value);
    }

    /** Joins the inventories of one run. */
    public static Machine of(Inventory inventory) {
        return new Machine(inventory);
    }

    /** The slots that match, in label order (unnumbered ones last, then by slot ID). */
    private static List<Slot> take(List<Slot> slots, Predicate<Slot> match) {
        List<Slot> taken = new ArrayList<>();
        slots.removeIf(slot -> match.test(slot) && taken.add(slot));
        taken.sort(Comparator.comparing((Slot s) -> s.label).thenComparing(s -> s.slotId));
        return Collections.unmodifiableList(taken);
    }

    /**
     * Puts each adapter with the functions of its card: one card per slot, bus and device for
     * adapters in a listed slot, per bus and device for on-board ones.
     */
    private void placeCards(InventoryTable adapters, Map<Long, Bus> busses, List<Slot> slots) {
        Map<String, Card> cards = new LinkedHashMap<>();
        for (int row = 0; row < adapters.size(); row++) {
            PciFunction function = new PciFunction(adapters, row, busses.get(
                adapters.value(row, "BusID")));
            Slot slot = null;
            for (Slot candidate : slots) {
                if (!function.onBoard && candidate.slotId == function.slotId) {
                    slot = candidate;
                    break;
                }
            }
            String key = (function.onBoard ? "b" : slot != null ? "s" : "u") + function.slotId
                + ":" + function.busId + ":" + function.device;
            Card card = cards.get(key);
            if (card == null) {
                card = new Card();
                cards.put(key, card);
                if (slot != null) {
                    slot.cards.add(card);
                } else if (function.onBoard) {
                    onBoard.add(card);
                } else {
                    unplaced.add(card);
                }
            }
            card.functions.add(function);
        }
        for (Card card : cards.values()) {
            card.functions.sort(Comparator.comparing((PciFunction f) -> f.function)
                .thenComparing(f -> f.adapterId));
        }
        Comparator<Card> byAddress = Comparator.comparing((Card c) -> c.busNumber())
            .thenComparing(Card::device).thenComparing(c -> c.first().adapterId);
        onBoard.sort(byAddress);
        unplaced.sort(byAddress);
        for (Slot slot : slots) {
            slot.cards.sort(byAddress);
        }
    }

    public String version() {
        return version;
    }

    /** The prerequisite status code; {@link AgentStatus#meaning} says it in words. */
    public long status() {
        return status;
    }

    /** Whether the agent learnt any chassis, drawer, bus or slot. */
    public boolean topologyFound() {
        return topology;
    }

    /** Chassis first, then drawers, each by number; slots of no listed system come last. */
    public List<Enclosure> enclosures() {
        return Collections.unmodifiableList(enclosures);
    }

    /** On-board devices, by bus number and device. */
    public List<Card> onBoard() {
        return Collections.unmodifiableList(onBoard);
    }

    /** Cards placed in a slot that the slot inventory does not list (a card file's mistake). */
    public List<Card> unplaced() {
        return Collections.unmodifiableList(unplaced);
    }

    /** Every slot of every enclosure, in the order of the report. */
    public List<Slot> slots() {
        List<Slot> all = new ArrayList<>();
        for (Enclosure enclosure : enclosures) {
            all.addAll(enclosure.slots);
        }
        return all;
    }

    /** The slot with this ID, or null when the slot inventory does not list it. */
    public Slot slot(long slotId) {
        for (Slot slot : slots()) {
            if (slot.slotId == slotId) {
                return slot;
            }
        }
        return null;
    }

    /** A chassis or an expansion drawer, or the slots that belong to no listed one. */
    public static final class Enclosure {
        private final boolean listed;
        private final long systemId;
        private final String name;
        private final long chassis;
        private final long drawer;
        private List<Slot> slots = List.of();

        private Enclosure(InventoryTable systems, int row) {
            listed = systems != null;
            systemId = listed ? systems.value(row, "SystemID") : NONE;
            name = listed ? systems.text(row, "Name") : null;
            chassis = listed ? systems.value(row, "ChassisNum") : NO_NUMBER;
            drawer = listed ? systems.value(row, "DrawerNum") : NO_NUMBER;
        }

        /** A drawer's slots carry its drawer number; a chassis's slots carry none. */
        private boolean holds(Slot slot) {
            return isDrawer() ? slot.drawer == drawer
                              : slot.drawer == NO_NUMBER && slot.chassis == chassis;
        }

        /** False for the slots whose chassis and drawer the system inventory does not list. */
        public boolean listed() {
            return listed;
        }

        public long systemId() {
            return systemId;
        }

        /** The system's name; null when it is not listed or the library gave none. */
        public String name() {
            return name;
        }

        public boolean isDrawer() {
            return listed && chassis == NO_NUMBER && drawer != NO_NUMBER;
        }

        /** The chassis number, 255 for a drawer. */
        public long chassis() {
            return chassis;
        }

        /** The drawer number, 255 for a chassis. */
        public long drawer() {
            return drawer;
        }

        /** Its slots in label order, unnumbered ones last. */
        public List<Slot> slots() {
            return slots;
        }
    }

    /** A PCI bus of the slot table. */
    public static final class Bus {
        private final long busId;
        private final long number;
        private final long speed;
        private final boolean pciX;
        private final boolean hotPlug;

        private Bus(InventoryTable busses, int row) {
            busId = busses.value(row, "BusID");
            number = busses.value(row, "BusNum");
            speed = busses.value(row, "CurBusSpeed");
            pciX = busses.value(row, "InPciXMode") != 0;
            hotPlug = busses.value(row, "SupHotPlug") != 0;
        }

        public long busId() {
            return busId;
        }

        /** The PCI bus number, as lspci prints it in hex. */
        public long number() {
            return number;
        }

        /** The current speed in MHz; 0 or {@link #NONE} when unknown. */
        public long speedMhz() {
            return speed;
        }

        /** Whether the speed is known. */
        public boolean speedKnown() {
            return speed != 0 && speed != NONE;
        }

        public boolean pciXMode() {
            return pciX;
        }

        public boolean hotPlug() {
            return hotPlug;
        }
    }

    /** A PCI slot, with what sits in it. */
    public static final class Slot {
        /** Watts of a card by the power code in bits 3 and 4 of the slot status. */
        private static final long[] POWER_WATTS = {8, 15, 25, 0};
        /** The speeds of the slot's speed bits, lowest bit first. */
        private static final String[] SPEEDS =
            {"33", "66", "PCI-X 66", "PCI-X 100", "PCI-X 133", "PCI-X 266", "PCI-X 533"};

        private final long slotId;
        private final long busId;
        private final long chassis;
        private final long drawer;
        private final long device;
        private final long label;
        private final long width;
        private final long attention;
        private final long status;
        private final long speedBits;
        private final boolean hotPlug;
        private final boolean blinking;
        private Bus bus;
        private final List<Card> cards = new ArrayList<>();

        private Slot(InventoryTable slots, int row) {
            slotId = slots.value(row, "SlotID");
            busId = slots.value(row, "BusID");
            chassis = slots.value(row, "ChassisNum");
            drawer = slots.value(row, "DrawerNum");
            device = slots.value(row, "DevNum");
            label = slots.value(row, "FriendlyNum");
            width = slots.value(row, "Width");
            attention = slots.value(row, "AttnReason");
            status = slots.value(row, "Status");
            speedBits = slots.value(row, "SpeedBits");
            hotPlug = slots.value(row, "SupHotPlug") != 0;
            blinking = slots.value(row, "AttnLedBlinking") != 0;
        }

        /** The ID that --blink takes. */
        public long slotId() {
            return slotId;
        }

        /** The number on the chassis (FriendlyNum); 255 when the slot has none. */
        public long label() {
            return label;
        }

        public boolean hasLabel() {
            return label != NO_NUMBER && label != NONE;
        }

        /** Its bus; null when the bus inventory does not list the slot's bus. */
        public Bus bus() {
            return bus;
        }

        public long busId() {
            return busId;
        }

        /** The PCI device number of the slot on its bus. */
        public long device() {
            return device;
        }

        /** The data path width in bits. */
        public long width() {
            return width;
        }

        /** The power the slot gives its card, in watts (0 for a slot without power). */
        public long powerWatts() {
            return POWER_WATTS[(int) (status >> 3) & 3];
        }

        /** The raw status byte. */
        public long status() {
            return status;
        }

        /** The attention reason that the slot driver reports; 0 for none. */
        public long attentionReason() {
            return attention;
        }

        public boolean ledBlinking() {
            return blinking;
        }

        public boolean hotPlug() {
            return hotPlug;
        }

        /** The speeds the slot takes, by its speed bits: "33", "66", "PCI-X 66" and so on. */
        public List<String> speeds() {
            List<String> speeds = new ArrayList<>();
            for (int bit = 0; bit < SPEEDS.length; bit++) {
                if ((speedBits & (1L << bit)) != 0) {
                    speeds.add(SPEEDS[bit]);
                }
            }
            return speeds;
        }

        public boolean isEmpty() {
            return cards.isEmpty();
        }

        /** What sits in the slot: usually one card, none when empty. */
        public List<Card> cards() {
            return Collections.unmodifiableList(cards);
        }

        /** The card in the slot (the first, should the inventory place two), or null. */
        public Card card() {
            return cards.isEmpty() ? null : cards.get(0);
        }
    }

    /** One card, or one on-board device: its PCI functions, lowest function first. */
    public static final class Card {
        private final List<PciFunction> functions = new ArrayList<>();

        private Card() {
        }

        public List<PciFunction> functions() {
            return Collections.unmodifiableList(functions);
        }

        /** Function 0 (or the lowest), which names the card. */
        public PciFunction first() {
            return functions.get(0);
        }

        public boolean multiFunction() {
            return functions.size() > 1;
        }

        /** The bus number of its functions; {@link #NONE} when their bus is not listed. */
        public long busNumber() {
            return first().busNumber();
        }

        public long device() {
            return first().device;
        }

        /** Whether any function is a boot device. */
        public boolean bootDevice() {
            for (PciFunction function : functions) {
                if (function.boot) {
                    return true;
                }
            }
            return false;
        }
    }

    /** One PCI function as the adapter inventories give it. */
    public static final class PciFunction {
        private final long adapterId;
        private final long slotId;
        private final long busId;
        private final Bus bus;
        private final long device;
        private final long function;
        private final long maxSpeed;
        private final long power;
        private final long width;
        private final boolean bridge;
        private final boolean boot;
        private final boolean pciX;
        private final boolean onBoard;
        private final String name;
        private final String pciId;
        private final String driver;

        private PciFunction(InventoryTable adapters, int row, Bus bus) {
            adapterId = adapters.value(row, "AdapterID");
            slotId = adapters.value(row, "SlotID");
            busId = adapters.value(row, "BusID");
            this.bus = bus;
            device = adapters.value(row, "Device");
            function = adapters.value(row, "Function");
            maxSpeed = adapters.value(row, "MaxSpeed");
            power = adapters.value(row, "PowerReq");
            width = adapters.value(row, "Width");
            bridge = adapters.value(row, "HasBridge") != 0;
            boot = adapters.value(row, "IsBootDev") != 0;
            pciX = adapters.value(row, "SupPciX") != 0;
            onBoard = adapters.value(row, "OnBoard") != 0;
            name = adapters.text(row, "Name");
            pciId = adapters.text(row, "PciId");
            driver = adapters.text(row, "Driver");
        }

        public long adapterId() {
            return adapterId;
        }

        /** The slot ID it sits in; {@link #NONE} for an on-board function. */
        public long slotId() {
            return slotId;
        }

        public long busId() {
            return busId;
        }

        /** The PCI bus number, from its bus; {@link #NONE} when the bus is not listed. */
        public long busNumber() {
            return bus == null ? NONE : bus.number;
        }

        public long device() {
            return device;
        }

        public long function() {
            return function;
        }

        /** The fastest bus speed it takes, in MHz. */
        public long maxSpeedMhz() {
            return maxSpeed;
        }

        /** The power it needs, in watts; {@link #NONE} when unknown. */
        public long powerWatts() {
            return power;
        }

        /** The data path width in bits; 0 when unknown. */
        public long width() {
            return width;
        }

        public boolean bridge() {
            return bridge;
        }

        public boolean bootDevice() {
            return boot;
        }

        public boolean pciX() {
            return pciX;
        }

        public boolean onBoard() {
            return onBoard;
        }

        /** The name; "<Unavailable>" or empty as the library gave it, null when absent. */
        public String name() {
            return name;
        }

        /** The 18 hex digits of vendor, device, subsystem vendor, subsystem and revision. */
        public String pciId() {
            return pciId;
        }

        /** "vendor:device" from the PCI identifier, or null when it has another form. */
        public String vendorDevice() {
            return pciId != null && pciId.matches("[0-9a-fA-F]{18}")
                ? pciId.substring(0, 4) + ":" + pciId.substring(4, 8) : null;
        }

        /** The module object file of its driver; empty or "<Unavailable>" when none. */
        public String driver() {
            return driver;
        }
    }
}
