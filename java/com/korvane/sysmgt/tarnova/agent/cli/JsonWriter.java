package com.korvane.sysmgt.tarnova.agent.cli;

/**
 * The inventory as one JSON document: version, status and an array per kind whose elements
 * have the field names as keys and the values exactly as the Java arrays hold them.
 */
public final class JsonWriter {
    private JsonWriter() {
    }

    public static String write(Inventory inventory) {
        StringBuilder out = new StringBuilder("{\n");
        out.append("  \"version\": ").append(quote(inventory.version())).append(",\n");
        out.append("  \"status\": ").append(inventory.status());
        for (InventoryTable table : inventory.tables()) {
            out.append(",\n  ").append(quote(table.title())).append(": [");
            for (int row = 0; row < table.size(); row++) {
                out.append(row == 0 ? "\n    " : ",\n    ");
                appendElement(out, table, row);
            }
            out.append(table.size() == 0 ? "]" : "\n  ]");
        }
        return out.append("\n}\n").toString();
    }

    private static void appendElement(StringBuilder out, InventoryTable table, int row) {
        out.append('{');
        String separator = "";
        for (int field = 0; field < table.fields().size(); field++) {
            out.append(separator).append(quote(table.fields().get(field))).append(": ")
                .append(table.value(row, field));
            separator = ", ";
        }
        for (String column : table.textColumns()) {
            out.append(separator).append(quote(column)).append(": ")
                .append(quote(table.text(row, column)));
            separator = ", ";
        }
        out.append('}');
    }

    /**
     * A JSON string literal, or null. Everything outside printable ASCII is escaped, so the
     * document is plain ASCII whatever the platform encoding, and a lone surrogate (a character
     * above U+FFFF that the library cut to 16 bits) survives unchanged.
     */
    public static String quote(String text) {
        if (text == null) {
            return "null";
        }
        StringBuilder out = new StringBuilder(text.length() + 2).append('"');
        for (int i = 0; i < text.length(); i++) {
            char c = text.charAt(i);
            switch (c) {
                case '"':
                    out.append("\\\"");
                    break;
                case '\\':
                    out.append("\\\\");
                    break;
                case '\n':
                    out.append("\\n");
                    break;
                case '\r':
                    out.append("\\r");
                    break;
                case '\t':
                    out.append("\\t");
                    break;
                default:
                    if (c < 0x20 || c > 0x7e) {
                        out.append(String.format("\\u%04x", (int) c));
                    } else {
                        out.append(c);
                    }
            }
        }
        return out.append('"').toString();
    }
}
