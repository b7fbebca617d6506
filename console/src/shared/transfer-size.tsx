import { ChoiceField, type Choice } from './fields';
import { transferSize } from './words';

const SIZES = [0, 4096, 8192, 16384, 32768, 65536, 131072, 262144, 524288, 1048576];

/** The sizes that a kernel uses, and the stored one. */
function choices(value: number): Choice<number>[] {
  const sizes = SIZES.includes(value) ? SIZES : [...SIZES, value].sort((a, b) => a - b);
  return sizes.map((size) => ({ value: size, text: transferSize(size) }));
}

export function TransferSizeField(props: {
  label: string;
  help?: string;
  value: number;
  onChange: (value: number) => void;
}) {
  return <ChoiceField {...props} choices={choices(props.value)} />;
}
