// SPDX-License-Identifier: Apache-2.0
package interop.judge;

import java.util.ArrayList;
import java.util.List;

/** What the judges found: a table for readers, and the disagreements that make the run fail. */
final class Verdicts {
  private final List<String> lines = new ArrayList<>();
  private int size;
  private final List<String> disagreements = new ArrayList<>();

  void title(String title, String... columns) {
    lines.add("");
    lines.add("**" + title + "**");
    lines.add("");
    row((Object[]) columns);
    lines.add("|" + "---|".repeat(columns.length));
  }

  void row(Object... cells) {
    StringBuilder line = new StringBuilder("|");
    for (Object cell : cells) {
      String text = String.valueOf(cell).replace("\\", "\\\\").replace("|", "\\|").replace("\n", " ");
      line.append(' ').append(text).append(" |");
    }
    lines.add(line.toString());
  }

  /** The cell for an answer; an answer that differs from the expected one is a disagreement. */
  String check(String subject, String expected, String found) {
    ++size;
    if (expected.equals(found)) {
      return found;
    }
    disagreements.add(subject + ": expected '" + expected + "', found '" + found + "'");
    return "**" + found + "**, expected " + expected;
  }

  /** Adds the rows and answers of another one. */
  void add(Verdicts other) {
    lines.addAll(other.lines);
    size += other.size;
    disagreements.addAll(other.disagreements);
  }

  /** How many answers were checked. */
  int size() {
    return size;
  }

  List<String> disagreements() {
    return disagreements;
  }

  String markdown() {
    return String.join("\n", lines).strip() + "\n";
  }
}
