package com.korvane.sysmgt.tarnova.agent.e2e;

import static org.junit.jupiter.api.Assertions.*;

import com.google.gson.*;
import java.io.IOException;
import java.nio.file.*;
import java.util.*;
import org.junit.jupiter.api.Test;
import org.junit.jupiter.api.io.TempDir;

/**
 * The default sample without its card file: element i of the numeric adapter inventory and of the
 * name, PCI ID and driver inventories is the i-th adapter that the sample's EXPECTED.md keeps,
 * last found first, with the boot flag of its final inventory.
 */
class AdapterInventoryTest {
    private static final String[] FIELDS = ("AdapterID SlotID MaxSpeed PowerReq Width HasBridge "
        + "IsBootDev SupPciX OnBoard BusID Device Function Name PciId Driver").split(" ");
    private static final Map<String, String> WORDS =
        Map.of("(empty)", "", "yes", "1", "no", "0", "-1", "4294967295", "0 (unset)", "0");

    @TempDir
    Path temp;

    @Test
    void theFourInventoriesDescribeTheExpectedAdaptersElementByElement() throws Exception {
        Path machine = AgentHarness.sample("chassis-drawer");
        // Discovery and filter, names, final inventory: each keyed by the adapter's identifier.
        List<Map<String, Map<String, String>>> tables = tables(machine.resolve("EXPECTED.md"));
        List<String> expected = new ArrayList<>();
        tables.get(0).forEach((id, row) -> {
            if (row.get("outcome").startsWith("kept")) {
                String[] function = row.get("function").split("[/.]");
                row.put("AdapterID", id);
                row.put("OnBoard", row.get("outcome").contains("on-board") ? "1" : "0");
                row.put("Device", String.valueOf(Integer.parseInt(function[1], 16)));
                row.put("Function", function[2]);
                row.put("Name", tables.get(1).get(id).get("Name"));
                row.put("IsBootDev", tables.get(2).get(id).get("boot"));
                expected.add(line(row::get));
            }
        });
        Collections.reverse(expected);

        AgentHarness.Result result = new AgentHarness(temp).onMachine(machine)
            .edit(copy -> Files.delete(copy.resolve("install/velhadp.crd")))
            .agent("--json");
        assertEquals(0, result.exitCode(), result::toString);
        List<String> actual = new ArrayList<>();
        for (JsonElement adapter : result.document().getAsJsonArray("adapters")) {
            actual.add(line(field -> adapter.getAsJsonObject().get(field).getAsString()));
        }
        assertEquals(expected, actual);
    }

    private static String line(java.util.function.UnaryOperator<String> adapter) {
        StringBuilder text = new StringBuilder();
        for (String field : FIELDS) {
            String value = adapter.apply(field);
            text.append(field).append('=').append(WORDS.getOrDefault(value, value)).append(' ');
        }
        return text.toString();
    }

    /** Every table of a Markdown file in order, its rows keyed by AdapterID or the first cell. */
    private static List<Map<String, Map<String, String>>> tables(Path file) throws IOException {
        List<Map<String, Map<String, String>>> tables = new ArrayList<>();
        String[] header = null;
        for (String text : Files.readAllLines(file)) {
            String[] cells = text.replaceFirst("^\\|", "").split(" *\\| *", -1);
            if (!text.startsWith("|") || header == null) {
                header = text.startsWith("|") ? cells : null;
                tables.add(new LinkedHashMap<>());
            } else if (!text.startsWith("|---")) {
                Map<String, String> row = new HashMap<>();
                for (int i = 0; i < header.length; i++) {
                    row.put(header[i].trim(), cells[i].trim());
                }
                tables.get(tables.size() - 1).put(row.getOrDefault("AdapterID", cells[0].trim()), row);
            }
        }
        tables.removeIf(Map::isEmpty);
        return tables;
    }
}
