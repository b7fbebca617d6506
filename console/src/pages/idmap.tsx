import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button } from '@patternfly/react-core';
import { useMayWrite } from '../session/session';
import { ListToolbar, useFilter } from '../shared/list';
import { PageFrame, ReadOnlyNotice } from '../shared/page';
import { CreateMappings } from './idmap/create';
import type { Mapping } from './idmap/data';
import { ChangeMapping, DeleteMapping } from './idmap/dialogs';
import { MappingTable } from './idmap/table';

interface Chosen {
  mapping: Mapping;
  wish: 'change' | 'delete';
}

export default function IdMapPage() {
  const [chosen, setChosen] = useState<Chosen | null>(null);
  const [creating, setCreating] = useState(false);
  const filter = useFilter();
  const mayWrite = useMayWrite();
  const close = () => {
    setChosen(null);
    setCreating(false);
  };
  return (
    <PageFrame
      title={i18n._('ID mapping')}
      purpose={i18n._(
        'Which user of the box a Kerberos principal is. Principals that are not listed are looked up by their names.',
      )}
    >
      <ReadOnlyNotice />
      <ListToolbar label={i18n._('Filter by principal or user')} filter={filter}>
        {mayWrite && (
          <Button
            onClick={() => {
              setCreating(true);
            }}
          >
            {i18n._('Add mappings')}
          </Button>
        )}
      </ListToolbar>
      <MappingTable filter={filter.value} onChoose={mayWrite ? setChosen : null} />
      {creating && <CreateMappings onClose={close} />}
      {chosen?.wish === 'change' && <ChangeMapping mapping={chosen.mapping} onClose={close} />}
      {chosen?.wish === 'delete' && <DeleteMapping mapping={chosen.mapping} onClose={close} />}
    </PageFrame>
  );
}
