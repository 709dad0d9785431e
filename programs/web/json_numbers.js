// The numbers of a JSON document. JavaScript knows them as floating point alone, so that some come
// out of JSON.parse as others than they are in the text.

const TOKENS = /"(?:[^"\\]|\\.)*"|-?[0-9][0-9.eE+-]*/g;

function survives(token) {
  const number = Number(token);
  if (!Number.isFinite(number)) {
    return false;
  }
  if (/^-?[0-9]+$/.test(token)) {
    return BigInt(token) === BigInt(number);
  }
  // Fractions are floating point for the server too; only what became nothing is lost.
  return number !== 0 || !/[1-9]/.test(token.split(/[eE]/)[0]);
}

// The first number of a document (which must be one) that JavaScript would change; undefined when
// there is none.
export const inexactNumber = (document) =>
    (document.match(TOKENS) ?? []).find((token) => !token.startsWith('"') && !survives(token));
