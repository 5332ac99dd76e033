// Colours of the charts. Okabe and Ito (2008), distinguishable for the colour-blind; between light and dark only those
// change that would be hard to see against the background. Lines also differ in dash or width.

export interface Look {
  ink: string;
  inkOnStrong: string; // on the ends of `diverging`
  muted: string;
  rule: string;
  faded: string; // switched off
  surface: string;
  observed: string;
  best: string;
  initial: string;
  band: string;
  dots: string;
  failed: string;
  bars: string;
  many: string[]; // for any number of equal series
  diverging: string[]; // -1 to +1
  sequential: string[]; // best to worst
}

const kLight: Look = {
  ink: '#1d2733',
  inkOnStrong: '#ffffff',
  muted: '#5b6875',
  rule: '#dfe4ea',
  faded: '#b4bdc7',
  surface: '#ffffff',
  observed: '#1d2733',
  best: '#0072b2',
  initial: '#e69f00',
  band: '#56b4e9',
  dots: '#7a8794',
  failed: '#d55e00',
  bars: '#0072b2',
  many: ['#0072b2', '#d55e00', '#009e73', '#cc79a7', '#e69f00', '#56b4e9', '#1d2733', '#9a8b00'],
  diverging: ['#d55e00', '#f0b48a', '#f7f8fa', '#8fc1dd', '#0072b2'],
  sequential: ['#0072b2', '#56b4e9', '#d9c9a0', '#e69f00'],
};

const kDark: Look = {
  ink: '#e3e8ee',
  inkOnStrong: '#0f151b',
  muted: '#9aa7b4',
  rule: '#323d49',
  faded: '#566370',
  surface: '#171e26',
  observed: '#e8edf2',
  best: '#56b4e9',
  initial: '#e69f00',
  band: '#3b8fc4',
  dots: '#8a98a6',
  failed: '#f07a28',
  bars: '#56b4e9',
  many: ['#56b4e9', '#f07a28', '#1fbf92', '#d998ba', '#e69f00', '#3b8fc4', '#e3e8ee', '#f0e442'],
  diverging: ['#e06a10', '#8a4d22', '#232c36', '#2b6a94', '#56b4e9'],
  sequential: ['#56b4e9', '#3b8fc4', '#8d7f52', '#e69f00'],
};

type Theme = 'light' | 'dark';

const system = window.matchMedia('(prefers-color-scheme: dark)');
const listeners: (() => void)[] = [];
let chosen: Theme | null = null;
let printing = false;

function theme(): Theme {
  if (printing) return 'light';
  return chosen ?? (system.matches ? 'dark' : 'light');
}

export function look(): Look {
  return theme() === 'dark' ? kDark : kLight;
}

/** The look on paper, and of drawings that are taken along. */
export const kPaperLook = kLight;

/** Calls `listener` whenever another look is to be drawn. */
export function onLookChange(listener: () => void): void {
  listeners.push(listener);
}

function apply(): void {
  document.documentElement.dataset.theme = theme();
  for (const listener of listeners) listener();
}

/** From light to dark and back, whatever the system says. */
export function switchTheme(): void {
  chosen = theme() === 'dark' ? 'light' : 'dark';
  apply();
}

/** Paper is light, whatever is on the screen. */
export function setPrinting(on: boolean): void {
  printing = on;
  apply();
}

system.addEventListener('change', apply);
document.documentElement.dataset.theme = theme();
