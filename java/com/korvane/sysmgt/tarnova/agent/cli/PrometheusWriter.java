package com.korvane.sysmgt.tarnova.agent.cli;

import java.io.PrintStream;
import java.util.ArrayList;
import java.util.HashSet;
import java.util.IdentityHashMap;
import java.util.List;
import java.util.Map;
import java.util.Set;

/**
 * The machine in Prometheus' text exposition format, for the node exporter's text-file
 * collector. What a slot holds travels as labels of an info metric (value 1); every measured
 * quantity is a gauge of its own, labelled with the slot or bus it belongs to, so that queries
 * join them on those labels. Chassis, drawer and slot numbers that stand for none, texts the
 * library could not give and unknown speeds are left out (an empty label, a missing sample).
 */
public final class PrometheusWriter {
    /** The labels that name a slot; the slot ID is the one that --blink takes. */
    private static final String[] SLOT = {"chassis", "drawer", "slot", "slot_id"};
    /** The labels that describe a card or an on-board device, from its first function. */
    private static final String[] CARD = {"adapter", "vendor_device", "driver", "functions"};
    /** The prerequisite codes that the agent reports, for the status metric's help. */
    private static final long[] STATUS_CODES = {0, 4, 6, 7, 8, 9, 10};

    private PrometheusWriter() {
    }

    /**
     * The metrics of one run.
     *
     * @param acquiredMillis when the acquisition began, in milliseconds since the epoch
     * @param warnings where a sample that repeats another one's labels is reported
     */
    public static String write(Machine machine, long acquiredMillis, PrintStream warnings) {
        List<Family> families = agentFamilies(machine, acquiredMillis);
        families.addAll(slotFamilies(machine));
        families.add(adapterFamily(machine));
        StringBuilder out = new StringBuilder();
        for (Family family : families) {
            family.appendTo(out, warnings);
        }
        return out.toString();
    }

    private static List<Family> agentFamilies(Machine machine, long acquiredMillis) {
        StringBuilder statusHelp = new StringBuilder("Prerequisite status of the agent:");
        for (long code : STATUS_CODES) {
            statusHelp.append(code == 0 ? " " : "; ").append(code).append(' ')
                .append(AgentStatus.meaning(code));
        }
        String seconds = String.format("%d.%03d", Math.floorDiv(acquiredMillis, 1000),
            Math.floorMod(acquiredMillis, 1000));
        return new ArrayList<>(List.of(
            new Family("tarnova_agent_info", "The agent's version.", "version")
                .add("1", machine.version()),
            new Family("tarnova_agent_status", statusHelp + ".")
                .add(Long.toString(machine.status())),
            new Family("tarnova_acquisition_timestamp_seconds",
                "When the agent began to read the slot hardware, in seconds since the epoch.")
                .add(seconds)));
    }

    /** Per slot its info and gauges; per bus with slots, once, its speed and mode. */
    private static List<Family> slotFamilies(Machine machine) {
        Family slotInfo = new Family("tarnova_slot_info",
            "A PCI slot: where it is, its bus and device, and the card in it, named by its "
                + "first function (adapter labels empty when the slot is empty).",
            concat(concat(SLOT, "system", "bus", "device", "occupied"), CARD));
        Family power = new Family("tarnova_slot_power_watts",
            "Power that the slot gives its card, in watts.", SLOT);
        Family blinking = new Family("tarnova_slot_attention_led_blinking",
            "1 while the slot's attention LED blinks.", SLOT);
        Family attention = new Family("tarnova_slot_attention_reason",
            "Attention reason that the slot driver reports for the slot; 0 for none.", SLOT);
        Family speed = new Family("tarnova_bus_speed_mhz",
            "Current speed of a PCI bus with slots, in MHz; absent while unknown.", "bus");
        Family pciX = new Family("tarnova_bus_pcix", "1 when the bus runs in PCI-X mode.", "bus");
        Map<Machine.Bus, Boolean> busses = new IdentityHashMap<>();
        for (Machine.Enclosure enclosure : machine.enclosures()) {
            for (Machine.Slot slot : enclosure.slots()) {
                String[] where = {number(enclosure.chassis()), number(enclosure.drawer()),
                                  slot.hasLabel() ? Long.toString(slot.label()) : "",
                                  Long.toString(slot.slotId())};
                Machine.Bus bus = slot.bus();
                String busNumber = bus == null ? "" : hex(bus.number());
                List<String> info = new ArrayList<>(List.of(where));
                info.addAll(List.of(text(enclosure.name()), busNumber, hex(slot.device()),
                    slot.isEmpty() ? "0" : "1"));
                info.addAll(card(slot.isEmpty() ? null : slot.cards().get(0)));
                slotInfo.add("1", info.toArray(new String[0]));
                power.add(Long.toString(slot.powerWatts()), where);
                blinking.add(slot.ledBlinking() ? "1" : "0", where);
                attention.add(Long.toString(slot.attentionReason()), where);
                if (bus != null && busses.put(bus, true) == null) {
                    if (bus.speedKnown()) {
                        speed.add(Long.toString(bus.speedMhz()), busNumber);
                    }
                    pciX.add(bus.pciXMode() ? "1" : "0", busNumber);
                }
            }
        }
        return List.of(slotInfo, power, blinking, attention, speed, pciX);
    }

    /** The on-board devices, and the cards whose slot the slot inventory does not list. */
    private static Family adapterFamily(Machine machine) {
        Family adapters = new Family("tarnova_adapter_info",
            "A PCI device outside the listed slots: on the system board (onboard 1), or a card "
                + "that the card file places in a slot the slot table does not list.",
            concat(new String[] {"slot_id", "bus", "device", "onboard"}, CARD));
        for (List<Machine.Card> cards : List.of(machine.onBoard(), machine.unplaced())) {
            for (Machine.Card card : cards) {
                Machine.PciFunction first = card.first();
                String slotId = first.slotId() == Machine.NONE ? "" : Long.toString(first.slotId());
                List<String> info = new ArrayList<>(List.of(slotId, hex(card.busNumber()),
                    hex(card.device()), first.onBoard() ? "1" : "0"));
                info.addAll(card(card));
                adapters.add("1", info.toArray(new String[0]));
            }
        }
        return adapters;
    }

    /** The card's labels: name, vendor:device and driver of its first function. */
    private static List<String> card(Machine.Card card) {
        if (card == null) {
            return List.of("", "", "", "0");
        }
        Machine.PciFunction first = card.first();
        return List.of(text(first.name()), text(first.vendorDevice()), text(first.driver()),
            Integer.toString(card.functions().size()));
    }

    private static String[] concat(String[] names, String... more) {
        List<String> all = new ArrayList<>(List.of(names));
        all.addAll(List.of(more));
        return all.toArray(new String[0]);
    }

    /** A chassis or drawer number; empty for the numbers that stand for none. */
    private static String number(long value) {
        return value == Machine.NO_NUMBER || value == Machine.NONE ? "" : Long.toString(value);
    }

    private static String hex(long value) {
        return Machine.hex(value, "");
    }

    /** A text of the library; empty for none, as Prometheus reads an empty label. */
    private static String text(String value) {
        return Machine.known(value) ? value : "";
    }

    /** One metric family: help, type and samples, all with the same label names. */
    static final class Family {
        private final String name;
        private final String help;
        private final List<String> labels = new ArrayList<>();
        private final StringBuilder samples = new StringBuilder();
        private final Set<String> series = new HashSet<>();
        private final List<String> repeated = new ArrayList<>();

        Family(String name, String help, String... labels) {
            this.name = name;
            this.help = help;
            this.labels.addAll(List.of(labels));
        }

        /**
         * Adds a sample, label values in the order of the names. A sample whose labels repeat
         * another's is left out: the collector would refuse the whole file for it.
         */
        Family add(String value, String... values) {
            if (values.length != labels.size()) {
                throw new IllegalArgumentException(name + " takes " + labels.size() + " labels");
            }
            StringBuilder sample = new StringBuilder(name);
            for (int i = 0; i < values.length; i++) {
                sample.append(i == 0 ? "{" : ",").append(labels.get(i)).append("=\"")
                    .append(escape(values[i], true)).append('"');
            }
            String key = sample.append(values.length == 0 ? "" : "}").toString();
            if (series.add(key)) {
                samples.append(key).append(' ').append(value).append('\n');
            } else {
                repeated.add(key);
            }
            return this;
        }

        /** Its lines, if it has a sample; a warning for each sample left out. */
        void appendTo(StringBuilder out, PrintStream warnings) {
            for (String key : repeated) {
                warnings.println("tarnova-agent: warning: metric left out, its labels repeat "
                    + "another's: " + key);
            }
            if (samples.length() > 0) {
                out.append("# HELP ").append(name).append(' ').append(escape(help, false))
                    .append("\n# TYPE ").append(name).append(" gauge\n").append(samples);
            }
        }

        /** Backslash and line feed escaped, and in a label value the double quote too. */
        static String escape(String text, boolean label) {
            StringBuilder out = new StringBuilder(text.length());
            for (int i = 0; i < text.length(); i++) {
                char c = text.charAt(i);
                if (c == '\\' || (label && c == '"')) {
                    out.append('\\').append(c);
                } else if (c == '\n') {
                    out.append("\\n");
                } else {
                    out.append(c);
                }
            }
            return out.toString();
        }
    }
}
