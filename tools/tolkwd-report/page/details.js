// What is known of the state that is pointed at or chosen.

const kMarksTold = 6;

// An item of a time line stands for one span, or for several too short to be drawn apart.
function single(item) {
    return item.first === item.last;
}

function itemends({service, first, last}) {
    return [service.spans[first], service.spans[last]];
}

function wheninwords(item) {
    const [begin, end] = itemends(item);
    return `${clocktext(begin.fromclock)} to ${clocktext(end.toclock)} ` +
        `(${spantext(end.to - begin.from)})`;
}

// The whole of it in one line, for those who hear it.
function iteminwords(item) {
    const state = single(item) ?
        item.word + (item.inferred ? ', inferred' : '') :
        `${item.last - item.first + 1} states, the worst ${item.word}`;
    return `${item.service.name}: ${state}, ${wheninwords(item)}`;
}

function marksof(item, extent) {
    const [begin, end] = itemends(item);
    return marksin(item.service, begin.from, end.to >= extent.to ? Infinity : end.to);
}

function markline(mark) {
    const line = element('li');
    line.append(signpicture(kSigns[signof(mark)]),
        element('time', '', clocktext(mark.clock)),
        element('span', '', mark.words + (mark.inferred ? ' (inferred)' : '')));
    return line;
}

// Those that matter most, in the order in which they happened.
function mainmarks(marks) {
    const graver = [...marks].sort((a, b) => signof(b) - signof(a) || a.at - b.at);
    return graver.slice(0, kMarksTold).sort((a, b) => a.at - b.at);
}

function marklist(marks) {
    const list = element('ul', 'marks');
    list.append(...mainmarks(marks).map(markline));
    if (marks.length > kMarksTold) {
        list.append(element('li', 'more', `and ${counttext(marks.length - kMarksTold)} more`));
    }
    return list;
}

function meaningof(item) {
    if (!single(item)) {
        return `${counttext(item.last - item.first + 1)} states too short to be drawn apart; the ` +
            'worst of them is shown. Zoom in to tell them apart.';
    }
    const means = kLooks[item.word]?.means ?? '';
    return item.inferred ? `${means}. ~ ${kGuessMeans}.` : `${means}.`;
}

class Details {
    constructor(target, extent) {
        this.target = target;
        this.extent = extent;
        this.shown = null;
        this.clear();
    }

    // `pointed`: by a pointer on its way, for which the panel is no obstacle.
    show(item, pointed) {
        this.target.classList.toggle('pointed', pointed);
        const key = item.key + '/' + item.service.id;
        if (this.shown === key) {
            return;
        }
        this.shown = key;
        const head = element('p', 'head');
        head.append(element('b', 'name', item.service.name), stateword(item.word, item.inferred),
            element('span', 'when', wheninwords(item)));
        this.target.replaceChildren(head, element('p', 'means', meaningof(item)));
        const marks = marksof(item, this.extent);
        if (marks.length > 0) {
            this.target.append(marklist(marks));
        }
        this.target.classList.remove('idle');
    }

    clear() {
        this.shown = null;
        this.target.replaceChildren(
            element('p', 'means', 'Point at a time line, tap it, or go there with the keys: what is ' +
                'known of that state is told here.'));
        this.target.classList.remove('pointed');
        this.target.classList.add('idle');
    }
}
