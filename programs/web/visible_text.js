// Titles, paths and names that somebody else wrote, made fit to be shown in a sentence: nothing in
// them may turn the words around, or leave nothing to be seen or pressed.

const TURNING = /[\p{Cc}\u061c\u200e\u200f\u2028\u2029\u202a-\u202e\u2066-\u2069]/gu;
const NOTHING_VISIBLE = /^[\p{White_Space}\p{Default_Ignorable_Code_Point}\p{Cc}\p{Cf}\u2800]*$/u;

const name = (character) =>
    "[U+" + character.codePointAt(0).toString(16).toUpperCase().padStart(4, "0") + "]";

// With the names of control characters and of those that change the direction in their places.
export const harmless = (text) => text.replace(TURNING, name);

export const isVisible = (text) => !NOTHING_VISIBLE.test(text);
