import { ShareList } from './shares/list';
import { SharePage } from './shares/share';

/** The list of shared folders, or one of them: #/shares/NAME. */
export default function Shares({ rest }: { rest: string[] }) {
  const [name] = rest;
  return name === undefined ? <ShareList /> : <SharePage key={name} name={name} />;
}
