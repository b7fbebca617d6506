// The files of a trial root that stand for what the kernel's NFS server knows of its clients (docs/clients.md).
import { appendFile, mkdir, rm, writeFile } from 'node:fs/promises';
import path from 'node:path';
import type { Box } from './base';

const folderOf = (box: Box, id: number) => path.join(box.root, 'proc/fs/nfsd/clients', String(id));

/** The file that takes orders about a client. */
export const controlOf = (box: Box, id: number) => path.join(folderOf(box, id), 'ctl');

/** A client of NFSv4.2 makes itself known, without open files. */
export async function addClient(box: Box, id: number, address: string) {
  await mkdir(folderOf(box, id));
  await writeFile(
    path.join(folderOf(box, id), 'info'),
    `clientid: 0x${id.toString(16)}\naddress: "${address}:871"\nstatus: confirmed\nname: "c${id}"\nminor version: 2\n`,
  );
  await writeFile(path.join(folderOf(box, id), 'states'), '');
  await writeFile(controlOf(box, id), '');
}

/** A client of NFSv4 leaves. */
export const removeClient = (box: Box, id: number) => rm(folderOf(box, id), { recursive: true });

/** A mount of NFSv3 is recorded; the client has no connection. */
export async function recordMount(box: Box, address: string, folder: string) {
  await mkdir(path.join(box.root, 'var/lib/nfs'), { recursive: true });
  await appendFile(path.join(box.root, 'var/lib/nfs/rmtab'), `${address}:${folder}:0x1\n`);
}

/** The kernel turns an address away that no rule is for. */
export const refuseAddress = (box: Box, address: string) =>
  appendFile(path.join(box.root, 'proc/net/rpc/auth.unix.ip/content'), `# nfsd ${address} -no-domain-\n`);

/** The kernel turns the clients of a rule away from a folder. */
export const refuseFolder = (box: Box, rule: string, folder: string) =>
  appendFile(path.join(box.root, 'proc/net/rpc/nfsd.export/content'), `# ${folder}\t${rule}()\n`);

/** The kernel has transferred this number of bytes. */
export async function countBytes(box: Box, read: number, written: number) {
  await writeFile(path.join(box.root, 'proc/net/rpc/nfsd'), `io ${read} ${written}\nth 8 0\n`);
}
