import { useRef, useState, type DragEvent } from 'react';
import { i18n } from '@lingui/core';
import { FileUploadField, type FileUploadFieldProps } from '@patternfly/react-core';

interface Props extends Omit<FileUploadFieldProps, 'onClearButtonClick' | 'onBrowseButtonClick' | 'onDrop'> {
  onChoose: (file: File) => void;
  onClear: () => void;
}

/** A file that is chosen or dragged here. PatternFly's FileUpload does the same with three more packages. */
export function FileField({ onChoose, onClear, ...field }: Props) {
  const input = useRef<HTMLInputElement>(null);
  const [isDragActive, setDragActive] = useState(false);
  const onDrag = (event: DragEvent) => {
    event.preventDefault(); // otherwise the browser opens a file that is dropped
    setDragActive(event.type === 'dragenter' || event.type === 'dragover');
  };
  return (
    <FileUploadField
      {...field}
      browseButtonText={i18n._('Choose')}
      isDragActive={isDragActive}
      onBrowseButtonClick={() => input.current?.click()}
      onClearButtonClick={onClear}
      onDragEnter={onDrag}
      onDragOver={onDrag}
      onDragLeave={onDrag}
      onDrop={(event: DragEvent) => {
        onDrag(event);
        const file = event.dataTransfer.files.item(0);
        if (file) onChoose(file);
      }}
    >
      <input
        ref={input}
        type="file"
        hidden
        onChange={({ target }) => {
          const file = target.files?.item(0);
          if (file) onChoose(file);
          target.value = ''; // otherwise choosing the same file again is no change
        }}
      />
    </FileUploadField>
  );
}
