export interface NewMapping {
  kerberos_principal: string;
  local_name: string;
}

export interface Lines {
  mappings: NewMapping[];
  /** The number, from 1, of the line of each mapping. */
  numbers: number[];
  /** The numbers, from 1, of the lines that are no mapping. */
  faulty: number[];
}

/** Reads lines of a CSV file: a principal and a user, between them a comma, a semicolon or a tab. */
export function parseLines(text: string): Lines {
  const result: Lines = { mappings: [], numbers: [], faulty: [] };
  text.split(/\r?\n/).forEach((line, index) => {
    if (line.trim() === '') return;
    const cells = line.split(/[,;\t]/).map((cell) => cell.trim().replace(/^"(.*)"$/, '$1'));
    const [principal, user] = cells;
    if (cells.length === 2 && principal && user) {
      result.mappings.push({ kerberos_principal: principal, local_name: user });
      result.numbers.push(index + 1);
    } else {
      result.faulty.push(index + 1);
    }
  });
  return result;
}
