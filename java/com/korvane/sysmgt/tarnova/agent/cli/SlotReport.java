package com.korvane.sysmgt.tarnova.agent.cli;

import java.util.ArrayList;
import java.util.List;

/**
 * The readable report: per chassis and drawer its slots in label order, each with its bus
 * address, speed, power and state and the card in it; then the on-board devices and the
 * prerequisite status. Whatever the agent does not know shows as "-".
 */
public final class SlotReport {
    private static final String NONE = "-";

    private SlotReport() {
    }

    public static String format(Machine machine) {
        StringBuilder out = new StringBuilder();
        out.append("Tarnova agent ").append(text(machine.version())).append('\n');
        for (Machine.Enclosure enclosure : machine.enclosures()) {
            out.append('\n').append(heading(enclosure)).append('\n');
            for (Machine.Slot slot : enclosure.slots()) {
                out.append("  ").append(describe(slot)).append('\n');
                for (Machine.Card card : slot.cards()) {
                    appendCard(out, card, "    ");
                }
            }
        }
        if (!machine.onBoard().isEmpty()) {
            out.append("\nOn-board devices\n");
            for (Machine.Card card : machine.onBoard()) {
                appendCard(out, card, "  ");
            }
        }
        if (!machine.unplaced().isEmpty()) {
            out.append("\nCards in slots that the slot table does not list\n");
            for (Machine.Card card : machine.unplaced()) {
                out.append("  Slot ID ").append(number(card.first().slotId())).append('\n');
                appendCard(out, card, "    ");
            }
        }
        if (!machine.topologyFound()) {
            out.append("\nNo slot topology found: ")
                .append(AgentStatus.whyNoTopology(machine.status())).append('\n');
        }
        out.append("\nStatus ").append(machine.status()).append(": ")
            .append(AgentStatus.meaning(machine.status())).append('\n');
        return out.toString();
    }

    private static String heading(Machine.Enclosure enclosure) {
        if (!enclosure.listed()) {
            return "Slots of no listed chassis or drawer";
        }
        return (enclosure.isDrawer() ? "Drawer " + number(enclosure.drawer())
                                     : "Chassis " + number(enclosure.chassis()))
            + ": " + text(enclosure.name());
    }

    /** "Slot 3 (ID 3)  at 02:01  PCI-X 100 MHz  64-bit  25 W  occupied". */
    static String describe(Machine.Slot slot) {
        List<String> parts = new ArrayList<>();
        parts.add((slot.hasLabel() ? "Slot " + slot.label() : "Unnumbered slot") + " (ID "
            + slot.slotId() + ")");
        Machine.Bus bus = slot.bus();
        parts.add("at " + (bus == null ? NONE : hex(bus.number())) + ":" + hex(slot.device()));
        parts.add(bus == null || !bus.speedKnown() ? "speed " + NONE
            : (bus.pciXMode() ? "PCI-X " : "PCI ") + bus.speedMhz() + " MHz");
        parts.add(bits(slot.width()));
        parts.add(slot.powerWatts() + " W");
        List<String> state = new ArrayList<>();
        state.add(slot.isEmpty() ? "empty" : "occupied");
        if (slot.hotPlug()) {
            state.add("hot plug");
        }
        if (slot.ledBlinking()) {
            state.add("LED blinking");
        }
        if (slot.attentionReason() != 0) {
            state.add("attention requested (reason " + number(slot.attentionReason()) + ")");
        }
        parts.add(String.join(", ", state));
        return String.join("  ", parts);
    }

    /**
     * The card's name and vendor:device, what it takes, then one line per function: its
     * address, driver file and boot flag, and its own name when it differs from the card's.
     */
    private static void appendCard(StringBuilder out, Machine.Card card, String indent) {
        Machine.PciFunction first = card.first();
        out.append(indent).append(text(first.name())).append("  [")
            .append(text(first.vendorDevice())).append("]\n");
        out.append(indent).append("  max ").append(first.maxSpeedMhz()).append(" MHz")
            .append(first.pciX() ? " PCI-X" : "").append(", ")
            .append(first.width() == 0 ? "width " + NONE : bits(first.width()))
            .append(", needs ").append(number(first.powerWatts())).append(" W")
            .append(first.bridge() ? ", bridge" : "").append('\n');
        for (Machine.PciFunction function : card.functions()) {
            out.append(indent).append("  ").append(address(function)).append("  driver ")
                .append(text(function.driver()));
            if (function.bootDevice()) {
                out.append("  boot device");
            }
            if (!text(function.name()).equals(text(first.name()))) {
                out.append("  ").append(text(function.name()));
            }
            out.append('\n');
        }
    }

    /** "02:01.1" as lspci writes it, "-" for a part the agent does not know. */
    static String address(Machine.PciFunction function) {
        return hex(function.busNumber()) + ":" + hex(function.device()) + "."
            + (function.function() == Machine.NONE ? NONE : function.function());
    }

    private static String hex(long value) {
        return Machine.hex(value, NONE);
    }

    private static String number(long value) {
        return value == Machine.NONE ? NONE : Long.toString(value);
    }

    private static String bits(long width) {
        return width == Machine.NONE ? "width " + NONE : width + "-bit";
    }

    /** A text, "-" for none: absent, empty or unavailable. */
    private static String text(String value) {
        return Machine.known(value) ? value : NONE;
    }
}
