// The message catalogue: the English wording of every message, by component and id. Private to the message log.
//
// A text holds its arguments at positional places, "%1$s" or "%1$d", and "%%" for a percent sign. The texts of the
// schema component come in two shapes, by how the schema engine raises them:
//
//   raised at a place in schema text  the first argument is the source, the second the line, and the pieces that the
//                                     failure marked as parameters follow from the third on;
//   raised for a definition           the marked pieces alone.
#pragma once

// The text of a message, or null when the catalogue doesn't know it. The text lives as long as the process.
const char* catalogue_text(int component, int id);

// Three letters that name a component in front of a message's id, or null when the catalogue doesn't know the
// component.
const char* catalogue_component(int component);
