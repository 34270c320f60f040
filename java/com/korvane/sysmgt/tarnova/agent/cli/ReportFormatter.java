package com.korvane.sysmgt.tarnova.agent.cli;

import java.util.ArrayList;
import java.util.List;

/** The readable report: version, status with its meaning, and one aligned table per kind. */
public final class ReportFormatter {
    private static final String GAP = "  ";

    private ReportFormatter() {
    }

    public static String format(Inventory inventory) {
        StringBuilder out = new StringBuilder();
        out.append("Agent version: ").append(inventory.version()).append('\n');
        out.append("Status: ").append(inventory.status()).append(" (")
            .append(AgentStatus.meaning(inventory.status())).append(")\n");
        for (InventoryTable table : inventory.tables()) {
            out.append('\n');
            appendTable(out, table);
        }
        return out.toString();
    }

    /** A field value as shown: the none value as "-". */
    public static String cell(long value) {
        return value == InventoryTable.NONE ? "-" : Long.toString(value);
    }

    private static void appendTable(StringBuilder out, InventoryTable table) {
        out.append(Character.toUpperCase(table.title().charAt(0)))
            .append(table.title().substring(1)).append(": ").append(table.size()).append('\n');

        List<String> header = new ArrayList<>(table.fields());
        header.addAll(table.textColumns());
        List<List<String>> lines = new ArrayList<>();
        lines.add(header);
        for (int row = 0; row < table.size(); row++) {
            List<String> line = new ArrayList<>();
            for (int field = 0; field < table.fields().size(); field++) {
                line.add(cell(table.value(row, field)));
            }
            for (String column : table.textColumns()) {
                String text = table.text(row, column);
                line.add(text == null ? "" : text);
            }
            lines.add(line);
        }

        int[] widths = new int[header.size()];
        for (List<String> line : lines) {
            for (int i = 0; i < line.size(); i++) {
                widths[i] = Math.max(widths[i], line.get(i).length());
            }
        }
        int numeric = table.fields().size();
        for (List<String> line : lines) {
            StringBuilder text = new StringBuilder();
            for (int i = 0; i < line.size(); i++) {
                String value = line.get(i);
                String padding = " ".repeat(widths[i] - value.length());
                text.append(i == 0 ? "" : GAP);
                // Numbers line up on the right, texts on the left.
                text.append(i < numeric ? padding + value : value + padding);
            }
            out.append(text.toString().stripTrailing()).append('\n');
        }
        if (table.size() == 0) {
            out.append("(none)\n");
        }
    }
}
