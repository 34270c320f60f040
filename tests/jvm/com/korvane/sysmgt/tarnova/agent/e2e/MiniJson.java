package com.korvane.sysmgt.tarnova.agent.e2e;

import java.util.ArrayList;
import java.util.LinkedHashMap;
import java.util.List;
import java.util.Map;

/**
 * A strict JSON reader for the tests: objects become LinkedHashMaps (key order kept, a repeated
 * key is an error), arrays Lists, integers Longs, strings Strings; anything else that JSON
 * allows but the agent never writes (fractions, exponents) is rejected.
 */
final class MiniJson {
    private final String text;
    private int at;

    private MiniJson(String text) {
        this.text = text;
    }

    static Object parse(String text) {
        MiniJson reader = new MiniJson(text);
        Object value = reader.value();
        reader.blanks();
        if (reader.at != text.length()) {
            throw reader.error("text after the document");
        }
        return value;
    }

    private Object value() {
        blanks();
        if (at >= text.length()) {
            throw error("document ends early");
        }
        char c = text.charAt(at);
        switch (c) {
            case '{':
                return object();
            case '[':
                return array();
            case '"':
                return string();
            case 'n':
                return word("null", null);
            case 't':
                return word("true", Boolean.TRUE);
            case 'f':
                return word("false", Boolean.FALSE);
            default:
                if (c == '-' || Character.isDigit(c)) {
                    return number();
                }
                throw error("unexpected " + c);
        }
    }

    private Map<String, Object> object() {
        Map<String, Object> members = new LinkedHashMap<>();
        expect('{');
        blanks();
        if (peek('}')) {
            at++;
            return members;
        }
        do {
            blanks();
            String key = string();
            blanks();
            expect(':');
            if (members.containsKey(key)) {
                throw error("repeated key " + key);
            }
            members.put(key, value());
            blanks();
        } while (consume(','));
        expect('}');
        return members;
    }

    private List<Object> array() {
        List<Object> elements = new ArrayList<>();
        expect('[');
        blanks();
        if (peek(']')) {
            at++;
            return elements;
        }
        do {
            elements.add(value());
            blanks();
        } while (consume(','));
        expect(']');
        return elements;
    }

    private String string() {
        expect('"');
        StringBuilder out = new StringBuilder();
        while (true) {
            if (at >= text.length()) {
                throw error("unterminated string");
            }
            char c = text.charAt(at++);
            if (c == '"') {
                return out.toString();
            }
            if (c < 0x20) {
                throw error("raw control character in string");
            }
            if (c != '\\') {
                out.append(c);
                continue;
            }
            char escape = text.charAt(at++);
            switch (escape) {
                case '"': case '\\': case '/':
                    out.append(escape);
                    break;
                case 'b':
                    out.append('\b');
                    break;
                case 'f':
                    out.append('\f');
                    break;
                case 'n':
                    out.append('\n');
                    break;
                case 'r':
                    out.append('\r');
                    break;
                case 't':
                    out.append('\t');
                    break;
                case 'u':
                    out.append((char) Integer.parseInt(text.substring(at, at + 4), 16));
                    at += 4;
                    break;
                default:
                    throw error("bad escape \\" + escape);
            }
        }
    }

    private Long number() {
        int start = at;
        if (peek('-')) {
            at++;
        }
        while (at < text.length() && Character.isDigit(text.charAt(at))) {
            at++;
        }
        String digits = text.substring(start, at);
        if (digits.isEmpty() || digits.equals("-") || digits.matches("-?0\\d+")) {
            throw error("bad number " + digits);
        }
        return Long.parseLong(digits);
    }

    private Object word(String word, Object value) {
        if (!text.startsWith(word, at)) {
            throw error("expected " + word);
        }
        at += word.length();
        return value;
    }

    private void blanks() {
        while (at < text.length() && " \t\r\n".indexOf(text.charAt(at)) >= 0) {
            at++;
        }
    }

    private boolean peek(char c) {
        return at < text.length() && text.charAt(at) == c;
    }

    private boolean consume(char c) {
        if (peek(c)) {
            at++;
            return true;
        }
        return false;
    }

    private void expect(char c) {
        if (!consume(c)) {
            throw error("expected " + c);
        }
    }

    private IllegalArgumentException error(String message) {
        return new IllegalArgumentException(message + " at offset " + at);
    }
}
