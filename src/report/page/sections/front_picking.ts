// The sets of a front, and which of them the reader looks at: the same in all charts and tables.
import type { Front } from '../data';

/** Places of the sets on the front, in order of the first objective. */
export const onFront = ({ ranks }: Front): number[] => ranks.flatMap((rank, place) => (rank === 1 ? [place] : []));

export class Picking {
  readonly places: number[];
  picked: number;
  private readonly listeners: (() => void)[] = [];

  constructor(front: Front) {
    this.places = onFront(front);
    this.picked = front.suggested ?? this.places[0]!;
  }

  pick(place: number | undefined): void {
    if (place === undefined || place === this.picked || !this.places.includes(place)) return;
    this.picked = place;
    this.listeners.forEach((listener) => listener());
  }

  /** The next one along the front, or one before; at an end none. */
  step(by: number): void {
    this.pick(this.places[this.places.indexOf(this.picked) + by]);
  }

  onPick(listener: () => void): void {
    this.listeners.push(listener);
  }
}
