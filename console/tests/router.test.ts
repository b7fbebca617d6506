import { act, renderHook } from '@testing-library/react';
import { beforeEach, expect, test, vi } from 'vitest';
import { linkTo, partsOf, queryOf, useGuard, usePath } from '../src/shared/router';

const follow = (address: string) => {
  act(() => {
    history.pushState(null, '', address);
    window.dispatchEvent(new HashChangeEvent('hashchange'));
  });
};

beforeEach(() => {
  follow('#/');
});

test('links keep every name', () => {
  const name = 'a/b c#d%ü';
  expect(partsOf(linkTo('shares', name).slice(1))).toEqual(['shares', name]);
});

test('a link hands values to a page', () => {
  expect(partsOf('/access/data?client=a%2Fb')).toEqual(['access', 'data']);
  expect(queryOf('/access/data?client=a%2Fb').get('client')).toBe('a/b');
  expect(queryOf('/access').get('client')).toBeNull();
});

test('an address that is no page is the first page', () => {
  const { result } = renderHook(() => usePath());
  follow('#/service');
  expect(result.current).toBe('/service');
  follow('#code=vornc_0');
  expect(result.current).toBe('/');
});

test('a guard stops a link until it is lifted', () => {
  const leave = vi.fn();
  const path = renderHook(() => usePath());
  const guard = renderHook(
    ({ active }) => {
      useGuard(active, leave);
    },
    { initialProps: { active: true } },
  );
  follow('#/service');
  expect(leave).toHaveBeenCalledWith('/service');
  expect(path.result.current).toBe('/');
  expect(location.hash).toBe('#/');
  guard.rerender({ active: false });
  follow('#/service');
  expect(path.result.current).toBe('/service');
});
