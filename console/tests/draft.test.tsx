import { act, renderHook } from '@testing-library/react';
import { expect, test } from 'vitest';
import { useDraft } from '../src/shared/use-draft';

const draftOf = () =>
  renderHook(({ stored, tag }) => useDraft(stored, tag), { initialProps: { stored: { size: 1 }, tag: 'one' } });

test('newer data replaces a draft without edits', () => {
  const { result, rerender } = draftOf();
  rerender({ stored: { size: 2 }, tag: 'two' });
  expect(result.current).toMatchObject({ value: { size: 2 }, tag: 'two', dirty: false });
});

test('a draft with edits keeps them, and the tag that it began with', () => {
  const { result, rerender } = draftOf();
  act(() => {
    result.current.change({ size: 5 });
  });
  rerender({ stored: { size: 2 }, tag: 'two' });
  expect(result.current).toMatchObject({ value: { size: 5 }, tag: 'one', dirty: true });
  act(() => {
    result.current.reset();
  });
  expect(result.current).toMatchObject({ value: { size: 2 }, tag: 'two', dirty: false });
});

test('an edit that is taken back is none', () => {
  const { result } = draftOf();
  act(() => {
    result.current.change({ size: 5 });
  });
  act(() => {
    result.current.change({ size: 1 });
  });
  expect(result.current.dirty).toBe(false);
});
