package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.assertEquals;

import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.Collections;
import java.util.HashMap;
import java.util.List;
import java.util.Map;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/**
 * The default sample without its card file: element i of the numeric adapter inventory and of the
 * name, PCI ID and driver inventories is the i-th adapter that the sample's EXPECTED.md keeps,
 * last found first.
 */
class AdapterInventoryTest {
    private static final String FIELDS = "AdapterID SlotID MaxSpeed PowerReq Width HasBridge "
        + "IsBootDev SupPciX OnBoard BusID Device Function Name PciId Driver";

    @TempDir
    Path temp;

    @Test
    void theFourInventoriesDescribeTheExpectedAdaptersElementByElement() throws IOException {
        Path machine = AgentHarness.sampleMachine("chassis-drawer");
        List<List<Map<String, String>>> tables = tables(machine.resolve("EXPECTED.md"));
        Map<String, String> names = new HashMap<>();
        tables.get(1).forEach(row -> names.put(row.get("ID"), row.get("Name")));
        Map<String, String> from = new HashMap<>();
        tables.get(2).forEach(row -> from.put(row.get("AdapterID"), row.get("from")));
        List<String> expected = new ArrayList<>();
        for (Map<String, String> row : tables.get(0)) {
            if (!row.get("outcome").startsWith("kept")) {
                continue;
            }
            String[] function = row.get("function").split("[/.]");
            Map<String, String> adapter = new HashMap<>(row);
            adapter.put("AdapterID", row.get("ID"));
            adapter.put("OnBoard", row.get("outcome").contains("on-board") ? "1" : "0");
            adapter.put("Device", String.valueOf(Integer.parseInt(function[1], 16)));
            adapter.put("Function", function[2]);
            adapter.put("Name", names.get(row.get("ID")));
            expected.add(line(adapter, from.get(row.get("ID"))));
        }
        Collections.reverse(expected);

        AgentHarness.Result result = new AgentHarness(temp).onMachine(machine)
            .editMachine(copy -> Files.delete(copy.resolve("install/velhadp.crd")))
            .agent("--json");
        assertEquals(0, result.exitCode, result::toString);
        List<String> actual = new ArrayList<>();
        for (Object adapter : (List<?>) result.document().get("adapters")) {
            Map<String, String> values = new HashMap<>();
            ((Map<?, ?>) adapter).forEach((key, value) -> values.put((String) key, "" + value));
            actual.add(line(values, from.get(values.get("AdapterID"))));
        }
        assertEquals(expected, actual);
    }

    /** The adapter as the inventories give it; a boot flag that a special case sets is left out. */
    private static String line(Map<String, String> adapter, String from) {
        Map<String, String> words =
            Map.of("(empty)", "", "yes", "1", "no", "0", "-1", "4294967295");
        StringBuilder text = new StringBuilder();
        for (String field : FIELDS.split(" ")) {
            String value = adapter.get(field).replaceAll(" \\(unset\\)$", "");
            boolean special = field.equals("IsBootDev") && String.valueOf(from).contains("special");
            text.append(field).append('=')
                .append(special ? "*" : words.getOrDefault(value, value)).append(' ');
        }
        return text.toString();
    }

    /** Every table of a Markdown file, its rows keyed by the header's cells. */
    private static List<List<Map<String, String>>> tables(Path file) throws IOException {
        List<List<Map<String, String>>> tables = new ArrayList<>();
        String[] header = null;
        for (String text : Files.readAllLines(file)) {
            if (!text.startsWith("|")) {
                header = null;
            } else if (header == null) {
                header = cells(text);
                tables.add(new ArrayList<>());
            } else if (!text.startsWith("|---")) {
                String[] cells = cells(text);
                Map<String, String> row = new HashMap<>();
                for (int i = 0; i < header.length; i++) {
                    row.put(header[i], cells[i]);
                }
                tables.get(tables.size() - 1).add(row);
            }
        }
        return tables;
    }

    private static String[] cells(String row) {
        return row.substring(1, row.length() - 1).trim().split("\\s*\\|\\s*", -1);
    }
}
